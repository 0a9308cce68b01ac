#pragma once

#include <exception>
#include <typeinfo>

#include "framework/qx/thread.h"
#include "indications/globals.h"

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

/// Runs what calls the agent or asks its nodes: an exception is logged and goes no further.
template <class Work>
void contained(Work work) {
    try {
        work();
    } catch (const std::exception& failure) {
        if (!isLeftBehind()) {
            logInd(kError) << "OsHwMIInd Caught " << failure.what() << " Type " << typeid(failure).name();
        }
    } catch (...) {
        if (!isLeftBehind()) {
            logInd(kError) << "OsHwMIInd Caught unknown exception";
        }
    }
}

}  // namespace IC
