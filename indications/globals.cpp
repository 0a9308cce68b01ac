// All globals of the indication source.
#include "indications/globals.h"

#include "mi/log.h"

namespace IC {

std::string OSHWMI_IND::loggerOsHwMIInd = "Corvista.IC.MI.OsHwMIInd";
const LogSource indicationsLogSource{"OsHwMIInd_ix86", &OSHWMI_IND::loggerOsHwMIInd};

Error OSHWMI_IND::myerr;
std::atomic<bool> OSHWMI_IND::datFileAvailable{false};

namespace OSHWMI_IND {

namespace {

Pass sharedPass;
// A pointer alone: a library with something to destroy at a thread's end stays mapped as long as the thread
// runs, whoever closes it.
thread_local Pass* ownPass = nullptr;

}  // namespace

Pass& pass() {
    return ownPass != nullptr ? *ownPass : sharedPass;
}

OwnPass::OwnPass() {
    ownPass = &pass_;
}

OwnPass::~OwnPass() {
    ownPass = nullptr;
}

}  // namespace OSHWMI_IND

}  // namespace IC
