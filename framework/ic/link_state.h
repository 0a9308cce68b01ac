#pragma once

namespace IC::LinkState {

/// What property 123 of network ports and IP configurations says, and what may be written to it.
enum Code : unsigned int {
    up = 1,
    bringUp = 9,  ///< written only: as up
    down = 12,
    takeDown = 16,      ///< written only: as down
    switchedOver = 32,  ///< bonds only, reported by the network monitor: a member has gone down
    switchedBack = 33,  ///< bonds only, reported by the network monitor: a member has come back
};

}  // namespace IC::LinkState
