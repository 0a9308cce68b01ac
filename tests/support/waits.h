#pragma once

#include <condition_variable>
#include <functional>
#include <mutex>
#include <thread>
#include <vector>

/// While it lives, knows of every sleep, event wait and limited join of the code under test, and can hold
/// another thread back that is about to begin one. One at a time; make it before the threads.
class Waits {
public:
    Waits();
    /// Lets go whom it holds.
    ~Waits();
    Waits(const Waits&) = delete;
    Waits& operator=(const Waits&) = delete;

    /// The waits begun so far, in seconds as they were asked for: of the thread that made this, and of all
    /// others.
    std::vector<double> ours() const;
    std::vector<double> others() const;
    /// Waits until that many were begun by the other threads.
    /// @return false when there are fewer after twenty seconds
    bool othersBegin(std::size_t count) const;
    /// Holds the other threads back that begin their wait of this number, counted from 1 over all of them, or
    /// a later one.
    void holdFrom(std::size_t number);
    void letGo();
    /// Called with each wait of the thread that made this, before it begins: of a stop that waits, for
    /// instance.
    void whenWeWait(std::function<void(double seconds)> action);

private:
    static void witness(double seconds);
    void note(double seconds);

    const std::thread::id us_ = std::this_thread::get_id();
    std::function<void(double)> action_;
    mutable std::mutex guard_;  // guards all below
    mutable std::condition_variable changed_;
    std::vector<double> ours_;
    std::vector<double> others_;
    std::size_t heldFrom_;
};
