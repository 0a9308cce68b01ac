#pragma once

#include <memory>

#include "framework/qx/thread.h"

namespace IC {

/// Waits for a thread of the plug-in's. After ten seconds its commands are ended.
void joinWithPatience(QX::Thread& thread);

/// Deletes a thread of the plug-in's that was stopped. One that still runs, the calling thread included, goes
/// when it ends, and this library stays mapped as long as the process lives.
void dropStopped(std::unique_ptr<QX::Thread> thread);

/// From now on no thread may outlive the library, since it is being closed: dropStopped waits.
void leaveNoThreads();

}  // namespace IC
