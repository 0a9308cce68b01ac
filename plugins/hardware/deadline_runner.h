#pragma once

#include <chrono>
#include <functional>
#include <memory>
#include <string>
#include <vector>

namespace hardware {

/// Runs what may wait for a device, and does not wait for ever. Work that does not return in time keeps its
/// thread until it does; meanwhile nothing else is asked of its device, and who asks for it is told so at
/// once. There are never more than 16 threads. Any thread.
class DeadlineRunner {
public:
    explicit DeadlineRunner(std::chrono::milliseconds limit);
    DeadlineRunner(const DeadlineRunner&) = delete;
    DeadlineRunner& operator=(const DeadlineRunner&) = delete;
    /// Work that still hangs is left to itself, and keeps this library in its place.
    ~DeadlineRunner();

    /// @param device what is asked; work for one device runs one at a time
    /// @param work owns all that it uses: it may return long after its caller has gone
    /// @return whether the work has been done
    bool run(const std::string& device, std::function<void()> work);

    /// Asks many, one after the other, in one thread. Each has the whole limit, but with each that does not
    /// answer the next ones get half of it: a bus with all its devices dead costs twice the limit.
    /// @param work gets the place in `devices`; as above
    /// @return for each whether its work has been done
    std::vector<bool> runAll(std::vector<std::string> devices, const std::function<void(std::size_t)>& work);

private:
    using Time = std::chrono::steady_clock::time_point;
    struct Job;
    struct State;

    bool runWithin(std::chrono::milliseconds limit, const std::string& device, std::function<void()> work);

    std::shared_ptr<State> state_;
    std::chrono::milliseconds limit_;
};

}  // namespace hardware
