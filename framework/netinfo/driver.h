#pragma once

#include <string>

namespace netinfo {

/// The name of the driver behind an interface of this host; "" when the kernel does not tell.
std::string driverName(const std::string& interface);

/// The address that the hardware came with, colon-separated in lower case; "" when the driver does not tell.
std::string driverPermanentAddress(const std::string& interface);

}  // namespace netinfo
