#pragma once

#include "framework/qx/thread.h"
#include "mi/log.h"

namespace IC {

/// Asked wherever the network monitor comes back from what can hang: whether the stop has gone on without its
/// thread. Then it ends the thread's log, and the thread has only to end: the agent takes the plug-in for
/// stopped, and in a process that ends the plug-in's globals go before the thread does. The log itself does
/// not ask: a callback that stops the plug-in runs on this thread, and that stop has lines to write.
inline bool isLeftBehind() {
    if (!QX::Thread::isLeft()) {
        return false;
    }
    endLogOfThisThread();
    return true;
}

}  // namespace IC
