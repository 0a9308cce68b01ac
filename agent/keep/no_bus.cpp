// Where the agent is built without libsystemd.
#include "agent/keep/daemons.h"
#include "agent/keep/host_files.h"

namespace cvagent::keep {

struct Daemons::Bus {};

Daemons::Daemons(const std::string& /*bus*/) {}
Daemons::~Daemons() = default;

bool Daemons::runs(const std::string& /*busName*/, const std::string& unit) {
    return unitHasProcesses(unit);
}

std::optional<ManagedLink> Daemons::networkManagerOn(const std::string& /*link*/) {
    if (unitHasProcesses("NetworkManager")) {
        throw NoAnswer("NetworkManager runs, but this program was built without a bus to ask it");
    }
    return std::nullopt;
}

}  // namespace cvagent::keep
