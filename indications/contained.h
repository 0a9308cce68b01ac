#pragma once

#include <exception>
#include <typeinfo>

#include "indications/globals.h"
#include "indications/left_behind.h"

namespace IC {

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
