// All globals of the processor source.
#include "cpu/globals.h"

namespace IC {

std::string loggerOsHwMICpu = "Corvista.IC.MI.OsHwMICpu";
const LogSource processorsLogSource{"OsHwMICpu_ix86", &loggerOsHwMICpu};

}  // namespace IC
