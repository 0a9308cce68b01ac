#pragma once

#include <string>

#include "tests/support/fake_host.h"

/// Puts a status file of tests/network/bonding where the driver shows it.
inline void installBond(FakeHost& host, const std::string& team, const std::string& status) {
    const auto text = host.read(testsDirectory() + "/network/bonding/" + status);
    ASSERT_TRUE(text) << status;
    host.file("/proc/net/bonding/" + team, *text);
}
