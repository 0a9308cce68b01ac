#pragma once

#include <exception>
#include <typeinfo>

#include "indications/globals.h"
#include "indications/left_behind.h"

namespace IC {

/// Runs work that others have a hand in: what it throws is logged and goes no further.
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
