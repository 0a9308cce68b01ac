#pragma once

#include <memory>

#include "framework/qx/thread.h"

namespace IC {

/// Waits for a thread of the plug-in's to end. After ten seconds it is aborted, which ends its commands.
void joinWithPatience(QX::Thread& thread);

/// Deletes a stopped thread's object. While the thread still runs (it may be the calling one), the object is
/// left to it, and this library stays mapped until the process ends.
void dropStopped(std::unique_ptr<QX::Thread> thread);

/// To be called when the library is being closed: from now on dropStopped waits for a thread that runs.
void leaveNoThreads();

}  // namespace IC
