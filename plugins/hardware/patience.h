#pragma once

#include <chrono>
#include <functional>
#include <memory>
#include <string>

namespace hardware {

/// Runs what may wait for a device, and does not wait for ever. Work that does not return in time keeps its
/// thread until it does; nothing else is asked of its device meanwhile. Any thread.
class Patience {
public:
    explicit Patience(std::chrono::milliseconds limit);
    Patience(const Patience&) = delete;
    Patience& operator=(const Patience&) = delete;
    /// Work that still hangs is left to itself, and keeps this library in its place.
    ~Patience();

    /// @param device what is asked; work for one device runs one at a time
    /// @param work owns all that it uses: it may return long after its caller has gone
    /// @return whether the work has been done
    bool run(const std::string& device, std::function<void()> work);

private:
    struct State;
    std::shared_ptr<State> state_;
    std::chrono::milliseconds limit_;
};

}  // namespace hardware
