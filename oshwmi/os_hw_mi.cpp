#include "oshwmi/os_hw_mi.h"

#include "mi/disk_snapshot.h"
#include "mi/globals.h"
#include "mi/log.h"
#include "network/saved_settings.h"

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

}  // namespace

OsHwMI myoshwmi;

// Without the cast each builder would be a copy of its own, not yet made, part of this object.
OsHwMI::OsHwMI()
    : ComputerBuilder(static_cast<NodeTree&>(*this)),
      NetworkBuilder(static_cast<NodeTree&>(*this)),
      ProcessorBuilder(static_cast<NodeTree&>(*this)),
      Indications(static_cast<NodeTree&>(*this)),
      StorageBuilder(static_cast<NodeTree&>(*this)) {}
OsHwMI::~OsHwMI() = default;

Error OsHwMI::initialize(unsigned int miId, const Number& ownNodeId, const Number& firstNodeId) {
    const LogScope scope;
    if (hasInventory()) {
        stopMonitors();  // the agent starts twice without a stop: they work on what is made anew here
    }
    // An unload has left both set: nodes would write to the host what their builders fill in, and the drive
    // monitor would end at once.
    OSHWMI::bInitflag = false;
    HardDriveNodeUpdate = false;
    resetInventory(true);
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
    resetInventory(false);
    return result;
}

Error OsHwMI::emptyTree() {
    // A write of the agent may have begun a walk, which still hangs its nodes under those that go here.
    const std::lock_guard noWalk(building);
    forgetStorageNodes();
    forgetProcessors();
    fixed = {};
    return ManagementInterface::unload();
}

void OsHwMI::createCpuNodes() {
    ProcessorBuilder::createCpuNodes();
}

void OsHwMI::stopMonitors() {
    guarded("stopHardDriveMonitor", [&] { stopHardDriveMonitor(); });
    guarded("disableIndications", [&] { disableIndications(); });
}

}  // namespace IC

/// The plug-in's one entry: hands out the plug-in object and the record of the last initialize's result.
/// @return 0
extern "C" __attribute__((visibility("default"))) int OpenMI(IC::ManagementInterface** mi, IC::Error** err) {
    const IC::LogScope scope;
    *mi = &IC::myoshwmi;
    *err = &IC::OSHWMI::myerr;
    return 0;
}
