#pragma once

#include <atomic>
#include <map>
#include <string>

#include "framework/ic/error.h"
#include "framework/netinfo/records.h"
#include "framework/qx/mutex.h"

namespace IC {

class OsHwMI;

/// The one plug-in object; its address is all the agent gets.
extern OsHwMI myoshwmi;
/// Set when unload begins; ends the drive monitor's loop.
extern std::atomic<bool> HardDriveNodeUpdate;

/// Port records by interface name, for looking up the parents of LAN endpoints; null while nobody keeps any.
extern std::map<std::string, CEthernetPort*>* m_mapEthernetPorts;

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
