// Where the agent is built without libsystemd.
#include "agent/keep/daemons.h"
#include "agent/keep/host_files.h"
#include "agent/keep/manager.h"

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

ManagerProfile profileOn(const std::string& /*link*/) {
    throw CannotKeep("this program was built without a bus to ask NetworkManager");
}

void updateProfile(const std::string& link, const ManagerProfile& /*before*/, const ProfileIp& /*wanted*/) {
    profileOn(link);
}

void rereadProfile(const std::string& link) {
    profileOn(link);
}

void loseManager(std::function<void(const std::string&)> /*tell*/) {}

const std::function<void(const std::string&)>* toldInstead() {
    return nullptr;
}

}  // namespace cvagent::keep
