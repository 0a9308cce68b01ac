#pragma once

namespace IC::LinkCode {

// What property 123 of ports and IP configurations can say.
constexpr unsigned int up = 1;
constexpr unsigned int down = 12;
constexpr unsigned int switchedOver = 32;  ///< bonds only, written by the network monitor
constexpr unsigned int switchedBack = 33;  ///< bonds only, written by the network monitor

}  // namespace IC::LinkCode
