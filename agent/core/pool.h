#pragma once

#include <algorithm>
#include <chrono>
#include <condition_variable>
#include <functional>
#include <memory>
#include <mutex>

namespace cvagent {

/// Threads that wait for the host, made one by one as they are needed and kept. Work is begun in the order in
/// which it came, but what belongs to one lane (a node) gets only some of the threads at once. A thread whose
/// work takes long, or was given up by who waited for it, is replaced by another one, up to a bound; a lane
/// with work that was given up gets no further thread until that work returns. So however many nodes hang,
/// each keeps a few threads at most, and the others go on. Any thread.
class Pool {
public:
    using Clock = std::chrono::steady_clock;

    /// When work is taken for what it is.
    struct Patience {
        Clock::duration slow = std::chrono::milliseconds(250);  ///< its thread is replaced
        Clock::duration stuck = std::chrono::seconds(1);        ///< and given up: its lane is not waited for
    };

    /// @param threads that work at once, not counting those that were replaced
    Pool(std::size_t threads, std::size_t perLane, Patience patience);
    Pool(std::size_t threads, std::size_t perLane) : Pool(threads, perLane, Patience()) {}
    /// As many for a lane as there are processors, and room for several lanes.
    Pool();
    Pool(const Pool&) = delete;
    Pool& operator=(const Pool&) = delete;
    /// Waits for the work that was begun; what was not is dropped. May be called by a thread of the pool.
    ~Pool();

    /// @param batch a mark for giveUp()
    /// @param work  must not throw
    /// Where the system gives no thread at all the work is done at once, on the calling thread.
    void submit(unsigned int lane, const void* batch, std::function<void()> work);
    /// Takes out the batch's work that was not begun; nobody waits any more for what was.
    void giveUp(const void* batch);
    /// Whether work of the lane was given up and has not returned for long.
    bool isStuck(unsigned int lane) const;
    /// Waits for the outcome of some work, under the caller's own lock, and sees to it meanwhile that threads
    /// are replaced.
    /// @return whether it came true until the deadline
    template <class Predicate>
    bool wait(std::condition_variable& changed, std::unique_lock<std::mutex>& lock,
              Clock::time_point deadline, const Predicate& predicate) {
        for (;;) {
            const auto look = std::min(deadline, Clock::now() + kLook);
            if (changed.wait_until(lock, look, predicate)) {
                return true;
            }
            if (look == deadline) {
                return false;
            }
            relieve();
        }
    }
    /// Waits until nothing is left to do.
    /// @return false when some work takes longer
    bool settle(std::chrono::milliseconds longest);
    /// How many threads there are.
    std::size_t threads() const;

private:
    static constexpr std::chrono::milliseconds kLook{50};

    void relieve();

    struct State;
    std::shared_ptr<State> state_;  // the threads hold it, too
};

}  // namespace cvagent
