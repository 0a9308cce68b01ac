#pragma once

#include "framework/qx/thread.h"
#include "mi/log.h"

namespace IC {

/// Whether a stop has given up waiting for the calling thread. To be asked after every call that can hang. If
/// so, the thread logs nothing more and has to end without touching anything: to the agent the plug-in has
/// stopped, and when the process ends, the plug-in's globals go before this thread does. The log cannot ask
/// by itself: a callback may stop the plug-in on this very thread, and that stop writes to the log.
inline bool isLeftBehind() {
    if (!QX::Thread::isLeft()) {
        return false;
    }
    endLogOfThisThread();
    return true;
}

}  // namespace IC
