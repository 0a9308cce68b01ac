#include "mi/os_hw_mi.h"

#include <utility>

#include "mi/disk_snapshot.h"
#include "mi/globals.h"
#include "mi/log.h"
#include "mi/shut_down.h"
#include "mi/stopped_thread.h"

namespace IC {

namespace {

struct Step {
    const char* name;
    void (*run)(OsHwMI& mi);
};

// The order of start-up: each builder hangs its nodes under those of the rows above it.
constexpr Step kStartUp[] = {
    {"createOsHwNodes", [](OsHwMI& mi) { mi.createOsHwNodes(); }},
    {"createRootNode", [](OsHwMI& mi) { mi.createRootNode(); }},
    {"createComputerNodes", [](OsHwMI& mi) { mi.createComputerNodes(); }},
    {"createChassisNodes", [](OsHwMI& mi) { mi.createChassisNodes(); }},
    {"createPlanarNodes", [](OsHwMI& mi) { mi.createPlanarNodes(); }},
    {"createNetworkControllerNodes", [](OsHwMI& mi) { mi.createNetworkControllerNodes(); }},
    {"createDiskControllerNodes", [](OsHwMI& mi) { mi.createDiskControllerNodes(); }},
    {"createHardDriveNodes", [](OsHwMI& mi) { mi.createHardDriveNodes(false); }},
    {"createPartitionNodes", [](OsHwMI& mi) { mi.createPartitionNodes(false); }},
    {"createNetworkPortNodes", [](OsHwMI& mi) { mi.createNetworkPortNodes(false); }},
    {"createNetworkTeamingNodes", [](OsHwMI& mi) { mi.createNetworkTeamingNodes(); }},
    {"enableIndications", [](OsHwMI& mi) { mi.enableIndications(); }},
    {"startHDDThread", [](OsHwMI& mi) { mi.startHDDThread(); }},
};

/// Runs one step; what it throws is logged and goes no further.
template <class Work>
void guarded(const char* name, Work work) {
    try {
        work();
    } catch (const std::exception& failure) {
        log(kError) << name << " failed: " << failure.what();
    } catch (...) {
        log(kError) << name << " failed: unknown exception";
    }
}

}  // namespace

OsHwMI::OsHwMI() = default;
OsHwMI::~OsHwMI() = default;

Error OsHwMI::initialize(unsigned int miId, const Number& ownNodeId, const Number& firstNodeId) {
    const LogScope scope;
    if (inventory_) {
        stopMonitors();  // an agent that starts twice without a stop: they use what is made anew here
    }
    // As at the first start, so also after an unload: the builders fill nodes, they must not write what they
    // read back to the host; and the drive monitor must run.
    OSHWMI::bInitflag = false;
    HardDriveNodeUpdate = false;
    {
        const std::lock_guard lock(inventoryGuard_);
        inventory_.emplace();
    }
    initializing_ = 1;
    guarded("updateHostAndDomainName", [&] { updateHostAndDomainName(); });
    OSHWMI::myerr = {Error::failure, Number(), ""};  // what stays when the base throws
    guarded("ManagementInterface::initialize", [&] {
        OSHWMI::myerr = ManagementInterface::initialize(miId, ownNodeId, firstNodeId);
        if (OSHWMI::myerr.getStatus() != 0) {
            log(kError) << "ManagementInterface::initialize failed: " << OSHWMI::myerr;
        }
    });
    for (const Step& step : kStartUp) {
        guarded(step.name, [&] { step.run(*this); });
    }
    Error result(Error::failure, Number(), "");  // what stays when there is no memory for a copy
    guarded("initialize", [&] { result = OSHWMI::myerr; });
    OSHWMI::bInitflag = true;
    return result;
}

Error OsHwMI::unload() {
    const LogScope scope;
    HardDriveNodeUpdate = true;
    stopMonitors();
    Error result = emptyTree();
    guarded("deleteSavedConfigurations", [] { deleteSavedConfigurations(); });
    guarded("deleteFdiskTmp", [] { deleteFdiskTmp(); });
    const std::lock_guard lock(inventoryGuard_);
    inventory_.reset();
    return result;
}

Error OsHwMI::emptyTree() {
    // A walk that a write of the agent has begun still hangs its nodes under those that go here.
    const std::lock_guard noWalk(portWalkGuard_);
    driveNodes_.clear();
    partitionNodes_.clear();
    tree_ = {};
    return ManagementInterface::unload();
}

void OsHwMI::publishNode(Node* node) {
    const LogScope scope;
    const Error result = addNewNode(node);
    if (result.getStatus() != 0) {
        log(kError) << "addNewNode error = " << result;
    }
}

void OsHwMI::stopMonitors() {
    guarded("stopHardDriveMonitor", [&] { stopHardDriveMonitor(); });
    guarded("disableIndications", [&] { disableIndications(); });
}

void OsHwMI::stopHardDriveMonitor() {
    if (!driveMonitorRuns_) {
        return;
    }
    driveMonitorRuns_ = false;
    driveMonitor_->stop();
    log(kProgress) << "disable Hard Drive updates: waiting for HardDriveUpdateMonitor Termination ";
    joinWithPatience(*driveMonitor_);
    log(kProgress) << "disable Hard Drive updates: HardDriveUpdateMonitor terminated.";
    dropStopped(std::move(driveMonitor_));
}

unsigned int OsHwMI::drawNodeId() {
    const std::lock_guard lock(inventoryGuard_);
    const unsigned int id = takeNodeId();
    if (inventory_) {
        inventory_->drawnIds.push_back(id);
    }
    return id;
}

void OsHwMI::rememberByName(const std::string& name, MutableNode* node) {
    const std::lock_guard lock(inventoryGuard_);
    if (inventory_) {
        auto& known = inventory_->nodesByName[name];
        if (known.expired()) {
            known = node->weak_from_this();
        }
    }
}

std::map<std::string, std::shared_ptr<MutableNode>> OsHwMI::nodesByName() const {
    std::map<std::string, std::shared_ptr<MutableNode>> held;
    const std::lock_guard lock(inventoryGuard_);
    if (!inventory_) {
        return held;
    }
    for (const auto& [name, known] : inventory_->nodesByName) {
        if (auto node = known.lock()) {  // the agent has not withdrawn it
            held.emplace(name, std::move(node));
        }
    }
    return held;
}

bool OsHwMI::findNetworkPort(std::string name, MutableNode** node) const {
    const auto held = findNetworkPort(name);
    *node = held ? held.get() : *node;
    return held != nullptr;
}

std::shared_ptr<MutableNode> OsHwMI::findNetworkPort(const std::string& name) const {
    const LogScope scope;
    const std::lock_guard lock(inventoryGuard_);
    if (!inventory_) {
        return nullptr;
    }
    const auto found = inventory_->nodesByName.find(name);
    return found == inventory_->nodesByName.end() ? nullptr : found->second.lock();
}

}  // namespace IC
