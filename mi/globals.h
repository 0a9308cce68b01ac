#pragma once

#include <atomic>
#include <string>

#include "framework/ic/error.h"
#include "framework/qx/mutex.h"

namespace IC {

/// Set when unload begins; ends the drive monitor's loop.
extern std::atomic<bool> HardDriveNodeUpdate;

namespace OSHWMI {

/// Result of the last initialize; its address is handed to the agent.
extern Error myerr;
/// Set at the end of initialize. Until then writes to a node only store the value; after it they act on the
/// host.
extern std::atomic<bool> bInitflag;
/// Held while a command that touches the disk snapshot is started. Never nested.
extern QX::Mutex myfileLock;
/// The logger component of everything but indications and processors.
extern std::string loggerOsHwMI;

}  // namespace OSHWMI
}  // namespace IC
