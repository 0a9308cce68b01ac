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

    /// Joins a thread that still runs. By then the subclass is gone: one whose run uses members of its own
    /// joins in its own destructor.
    virtual ~Thread();
    /// Asks the thread to end; what that means is the subclass's business.
    virtual void stop();
    virtual void* run(void* argument);

    /// Runs run(argument) on a new thread; false when the system gives none or the last one still runs. An
    /// exception that leaves run ends the thread and is logged.
    bool start(void* argument);
    /// Waits until run has returned; a sleep of the thread returns early while it is waited for, and after an
    /// abort the commands it still starts are killed. At once for a thread that does not run, and on the
    /// thread itself.
    void join();
    /// Ends the thread without cancelling it in the middle of anything: its sleeps and event waits return at
    /// once and the commands it has started are killed with all their descendants, so that its reads end and
    /// run returns by itself. Does not wait for run.
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
