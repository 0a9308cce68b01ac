#pragma once

#include "framework/qx/thread.h"
#include "mi/log.h"

namespace IC {

/// Asked wherever the network monitor comes back from what can hang: whether the stop has gone on without its
/// thread. From then on it says nothing more and has only to end: the agent takes the plug-in for stopped,
/// and in a process that ends the plug-in's globals go before the thread does.
inline bool isLeftBehind() {
    if (!QX::Thread::isLeft()) {
        return false;
    }
    endLogOfThisThread();
    return true;
}

}  // namespace IC
