#pragma once

#include <memory>

#include "framework/export.h"

namespace QX {

/// A thread of the plug-in's own. start, join, abort and stop may be called from any thread.
class CORVISTA_API Thread {
public:
    Thread();
    Thread(const Thread&) = delete;
    Thread& operator=(const Thread&) = delete;

    /// Joins a thread that still runs.
    virtual ~Thread();
    /// Asks the thread to end; what that means is the subclass's business.
    virtual void stop();
    virtual void* run(void* argument);

    /// Runs run(argument) on a new thread; false when the system gives none.
    bool start(void* argument);
    /// Waits until run has returned; a sleep of the thread returns early while it is waited for.
    void join();
    /// Ends the thread without cancelling it in the middle of anything: its sleeps return at once and the
    /// commands it has started are killed, so that its reads end and run returns by itself. Does not wait.
    void abort();

    /// Blocks the calling thread. Returns early in a thread that is being joined or aborted.
    /// @param milliseconds how long
    static void sleep(unsigned int milliseconds);

private:
    struct State;
    std::shared_ptr<State> state_;
};

/// Makes sleeps and event timeouts run faster by that factor, so that minutes of a monitor's waiting cost a
/// test seconds. 1 is real time. For tests alone.
CORVISTA_API void setClockSpeed(double factor);

}  // namespace QX
