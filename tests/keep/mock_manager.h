#pragma once

#include <atomic>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <thread>
#include <variant>

#include "agent/bus/connection.h"

/// A NetworkManager that tells of its links what it was told to, on a bus of the test's.
class MockManager {
public:
    struct Path {
        std::string text;
    };
    using Value = std::variant<bool, std::uint32_t, std::string, Path>;
    /// What there is: "PATH PROPERTY".
    using Objects = std::map<std::string, Value>;

    /// @param silent it has its name and answers nothing
    MockManager(const std::string& address, std::map<std::string, std::string> devices, Objects objects,
                bool silent = false);
    MockManager(const MockManager&) = delete;
    MockManager& operator=(const MockManager&) = delete;
    ~MockManager();

private:
    void serve(const std::string& address);
    void answer(const cvagent::bus::Message& call) const;

    const std::map<std::string, std::string> devices_;
    const Objects objects_;
    const bool silent_;
    std::atomic<bool> ready_ = false;
    std::atomic<bool> stopped_ = false;
    std::thread thread_;
};
