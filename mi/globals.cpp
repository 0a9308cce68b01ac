// All globals of the main source. Those that have to be constructed come before the plug-in object, wherever
// the linker puts that: its nodes log when they go, so they must go first.
#include "mi/globals.h"

#include "mi/log.h"
#include "mi/my_process.h"

namespace IC {

[[gnu::init_priority(1000)]] std::string OSHWMI::loggerOsHwMI = "Corvista.IC.MI.OsHwMI";
const LogSource mainLogSource{"OsHwMI_ix86", &OSHWMI::loggerOsHwMI};

std::atomic<int> MyProcess::cnt{0};
std::atomic<bool> OSHWMI::bInitflag{false};
std::atomic<bool> HardDriveNodeUpdate{false};
[[gnu::init_priority(1000)]] Error OSHWMI::myerr;
[[gnu::init_priority(1000)]] QX::Mutex OSHWMI::myfileLock;

}  // namespace IC
