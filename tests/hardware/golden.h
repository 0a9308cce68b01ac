#pragma once

#include <filesystem>
#include <string>

#include "plugins/hardware/host.h"

namespace hardware_test {

/// All that the sources tell of a host, one line a property: for people to read and for tests to compare.
std::string told(const hardware::Host& host);

/// The recorded hosts: tests/hardware/hosts.
std::filesystem::path recordedHosts();

}  // namespace hardware_test
