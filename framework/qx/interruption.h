#pragma once

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <mutex>

namespace QX {

/// What lets others cut the waits of one Thread short. The running thread finds its own with ofThisThread.
class Interruption {
public:
    /// Null in threads that no QX::Thread runs.
    static Interruption* ofThisThread();
    static void setForThisThread(Interruption* interruption);

    /// Sleeps return at once from now on.
    void endSleeps();
    /// Sleeps and event waits return at once from now on.
    void abort();
    /// Nobody waits for the thread any more.
    void leave() { left_ = true; }
    void reset();
    bool aborted() const { return aborted_; }
    bool left() const { return left_; }
    void sleep(std::chrono::nanoseconds duration);

private:
    friend class AbortableWait;
    void setWait(std::mutex* guard, std::condition_variable* changed);

    std::atomic<bool> aborted_ = false;  // also read under the guard of a wait
    std::atomic<bool> left_ = false;
    std::mutex guard_;  // guards everything below; taken before the guard of a wait
    std::condition_variable changed_;
    bool sleepsEnd_ = false;
    std::mutex* waitGuard_ = nullptr;
    std::condition_variable* waitChanged_ = nullptr;
};

/// While it stands, an abort of this thread wakes the condition variable. Make it before the guard is locked,
/// destroy it after the guard is released.
class AbortableWait {
public:
    AbortableWait(std::mutex& guard, std::condition_variable& changed);
    AbortableWait(const AbortableWait&) = delete;
    AbortableWait& operator=(const AbortableWait&) = delete;
    ~AbortableWait();
    bool aborted() const { return interruption_ != nullptr && interruption_->aborted(); }

private:
    Interruption* const interruption_;
};

}  // namespace QX
