#pragma once

#include <chrono>
#include <functional>
#include <memory>

namespace cvagent {

/// Threads that wait for the host, made one by one as they are needed and kept. Work is begun in the order in
/// which it came, with one exception: what belongs to one lane (a node) gets only some of the threads at
/// once, so that a node whose host commands hang leaves the others enough. Any thread.
class Pool {
public:
    Pool(std::size_t threads, std::size_t perLane);
    /// As many for a lane as there are processors, and room for several lanes that hang.
    Pool();
    Pool(const Pool&) = delete;
    Pool& operator=(const Pool&) = delete;
    /// Waits for the work that was begun; what was not is dropped. May be called by a thread of the pool.
    ~Pool();

    /// @param batch a mark for drop()
    /// @param work  must not throw
    /// Where the system gives no thread at all the work is done at once, on the calling thread.
    void submit(unsigned int lane, const void* batch, std::function<void()> work);
    /// Takes out the batch's work that was not begun.
    void drop(const void* batch);
    /// Waits until nothing is left to do.
    /// @return false when some work takes longer
    bool settle(std::chrono::milliseconds longest);

private:
    struct State;
    std::shared_ptr<State> state_;  // the threads hold it, too
};

}  // namespace cvagent
