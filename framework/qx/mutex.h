#pragma once

#include <condition_variable>
#include <mutex>

#include "framework/export.h"

namespace QX {

/// A lock with a timeout. It is not recursive, and any thread may unlock it.
class CORVISTA_API Mutex {
public:
    Mutex();
    Mutex(const Mutex&) = delete;
    Mutex& operator=(const Mutex&) = delete;
    ~Mutex();

    /// @param milliseconds how long to wait at the most; all ones waits for ever
    /// @return whether the lock is held now
    bool lock(unsigned long milliseconds);
    void unlock();

private:
    std::mutex guard_;
    std::condition_variable freed_;
    bool held_ = false;  // guarded by guard_
};

}  // namespace QX
