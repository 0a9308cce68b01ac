#pragma once

#include <mutex>

#include "framework/export.h"

namespace QX {

/// A lock with a timeout.
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
    std::timed_mutex mutex_;
};

}  // namespace QX
