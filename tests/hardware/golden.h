#pragma once

#include <filesystem>
#include <map>
#include <string>

#include "plugins/hardware/catalogue.h"
#include "plugins/hardware/host.h"

namespace hardware_test {

/// All that the sources tell of a host, one line a property: for people to read and for tests to compare.
std::string told(const hardware::Host& host);

/// The facts of one thing by the names of their properties, as texts.
std::map<std::string, std::string> factsOf(const hardware::Host& host, hardware::Class type,
                                           const std::string& name);

/// The recorded hosts: tests/hardware/hosts.
std::filesystem::path recordedHosts();

}  // namespace hardware_test
