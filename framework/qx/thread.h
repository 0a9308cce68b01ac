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
    /// Waits until run has returned; a sleep of the thread returns early once it was waited for. At once for
    /// a thread that does not run, and on the thread itself.
    void join();
    /// The same, but not for longer than that.
    /// @return whether the thread has ended; never on the thread itself
    bool joinWithin(unsigned int milliseconds);
    /// Ends the thread without cancelling it in the middle of anything: its sleeps and event waits return at
    /// once and the commands it has started are killed with all their descendants, again and again until run
    /// has returned, so that its reads end and it does so by itself. Does not wait for it.
    void abort();
    /// Leaves a thread that does not end to itself: the object goes, on its own thread, when run has
    /// returned; at once when it has already. All that run uses must live as long, its code included.
    static void leave(std::unique_ptr<Thread> thread);

    /// Whether the calling thread is the one that executes this object's run.
    bool isThisThread() const;
    /// Whether the calling thread is one that is being aborted: it is to start nothing new.
    static bool isAborted();
    /// Whether the calling thread was left: nobody waits for it, and those it worked for may be gone.
    static bool isLeft();

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
