#pragma once

#include <condition_variable>
#include <mutex>

#include "framework/export.h"

namespace QX {

/// A signal that threads wait for. A signal given before the wait is not lost.
class CORVISTA_API Event {
public:
    /// @param autoReset true: one signal releases one wait; false: it stays signalled.
    explicit Event(bool autoReset);
    Event(const Event&) = delete;
    Event& operator=(const Event&) = delete;
    ~Event();

    void signal();
    /// Waits until the event is signalled or the time runs out. Returns early in a thread that is being
    /// aborted.
    /// @param seconds how long at the most
    /// @return whether the event was signalled
    bool wait(unsigned long seconds);

private:
    const bool autoReset_;
    std::mutex guard_;
    std::condition_variable changed_;
    bool signalled_ = false;  // guarded by guard_
};

}  // namespace QX
