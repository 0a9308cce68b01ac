#pragma once

#include <functional>
#include <thread>

namespace hardware {

/// Starts a thread that gets no signals: those are the agent's. std::system_error when there is none.
std::thread quietThread(std::function<void()> work);

}  // namespace hardware
