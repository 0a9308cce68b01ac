// All globals of the main source, in the order of their construction; they go in the reverse order when the
// library is unloaded.
#include "mi/globals.h"

#include "mi/log.h"
#include "mi/my_process.h"
#include "mi/os_hw_mi.h"

namespace IC {

std::string OSHWMI::loggerOsHwMI = "Corvista.IC.MI.OsHwMI";
const LogSource mainLogSource{"OsHwMI_ix86", &OSHWMI::loggerOsHwMI};

std::atomic<int> MyProcess::cnt{0};
std::atomic<bool> OSHWMI::bInitflag{false};
std::atomic<bool> HardDriveNodeUpdate{false};
std::map<std::string, CEthernetPort*>* m_mapEthernetPorts = nullptr;
Error OSHWMI::myerr;
QX::Mutex OSHWMI::myfileLock;
OsHwMI myoshwmi;

}  // namespace IC
