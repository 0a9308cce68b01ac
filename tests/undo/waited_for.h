#pragma once

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <sstream>
#include <string>

#include "tests/support/fake_host.h"

/// Whether somebody waits for the lock of a file or directory of the fake host.
inline bool isWaitedFor(const FakeHost& host, const std::string& lock) {
    struct stat found {};
    EXPECT_EQ(stat(lock.c_str(), &found), 0);
    std::istringstream lines(host.read("/.proc/locks").value_or(""));
    const std::string place = ":" + std::to_string(found.st_ino) + " ";
    for (std::string line; std::getline(lines, line);) {
        if (line.find("-> ") != line.npos && line.find(place) != line.npos) {
            return true;
        }
    }
    return false;
}
