#pragma once

#include <atomic>
#include <map>
#include <set>
#include <string>
#include <vector>

#include "framework/ic/error.h"

namespace IC::OSHWMI_IND {

/// What sending an alert gives when nobody listens.
extern Error myerr;
/// What a pass works on. Each monitor's thread has its own: one that hangs in a callback of the agent
/// outlives the stop, and the next start's has another.
struct Pass {
    std::map<std::string, unsigned int> current;           ///< link state by interface
    std::map<std::string, unsigned int> previous;          ///< as the pass before found it
    std::vector<std::string> slaves;                       ///< member ports of all bonds
    std::map<std::string, std::set<std::string>> members;  ///< of each bond, as it was listed last
    std::vector<std::string> untold;  ///< interfaces about which a command was ended by force
};
/// The calling thread's; those without an own one share one.
Pass& pass();
/// While it lives, the calling thread has its own. Held by the thread itself.
class OwnPass {
public:
    OwnPass();
    OwnPass(const OwnPass&) = delete;
    OwnPass& operator=(const OwnPass&) = delete;
    ~OwnPass();

private:
    Pass pass_;
};
/// Whether the last read of the state file found one.
extern std::atomic<bool> datFileAvailable;
/// The logger component of the indications.
extern std::string loggerOsHwMIInd;

}  // namespace IC::OSHWMI_IND
