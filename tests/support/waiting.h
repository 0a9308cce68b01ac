#pragma once

#include <chrono>
#include <cstddef>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <thread>

/// The action of a tool that hangs until the test says host.file("/go-on", "").
inline constexpr char kUntilItMayGoOn[] = "until [ -e /go-on ]; do sleep 0.01; done";

/// Whether something comes true within half a minute.
template <class Condition>
bool eventually(const Condition& condition) {
    const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(30);
    bool holds = condition();
    while (!holds && std::chrono::steady_clock::now() < end) {
        std::this_thread::sleep_for(std::chrono::milliseconds(2));
        holds = condition();
    }
    return holds;
}

/// Whether a link's carrier comes: the kernel takes note of it some time after both ends of a cable are up.
inline bool carrierComes(const std::string& link) {
    return eventually([&link] {
        std::string state;
        std::ifstream("/sys/class/net/" + link + "/operstate") >> state;
        return state == "up";
    });
}

/// The threads of this process: one that was joined is counted a moment longer.
inline std::size_t runningThreads() {
    const std::filesystem::directory_iterator tasks("/proc/self/task");
    return static_cast<std::size_t>(std::distance(begin(tasks), end(tasks)));
}
