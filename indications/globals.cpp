// All globals of the indication source.
#include "indications/globals.h"

namespace IC {

std::string OSHWMI_IND::loggerOsHwMIInd = "Corvista.IC.MI.OsHwMIInd";
const LogSource indicationsLogSource{"OsHwMIInd_ix86", &OSHWMI_IND::loggerOsHwMIInd};

Error OSHWMI_IND::myerr;
std::atomic<bool> OSHWMI_IND::datFileAvailable{false};

}  // namespace IC
