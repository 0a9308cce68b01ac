#pragma once

#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "mi/globals.h"
#include "mi/node_types.h"
#include "oshwmi/os_hw_mi.h"

namespace IC {

/// What tests see of the plug-in object's insides, and set in the place of its builders. What takes no object
/// is about the one there is, myoshwmi.
struct OsHwMITestAccess {
    /// The containers as initialize makes them, without a tree and without monitors.
    static void makeInventory(OsHwMI& mi) { mi.resetInventory(true); }
    static bool hasInventory() { return myoshwmi.hasInventory(); }
    static std::vector<unsigned int> drawnIds() { return myoshwmi.drawnIds_; }
    static MutableNode* computer(OsHwMI& mi) { return mi.fixed.computer; }

    /// The host's names as they were read last, line breaks included.
    static const std::string& hostName(const OsHwMI& mi) { return mi.hostName; }
    static const std::string& domainName(const OsHwMI& mi) { return mi.domainName; }

    /// Lists a node and remembers it as an interface's.
    static void addInterface(OsHwMI& mi, const std::string& name, MutableNode* node) {
        mi.appendNode(node);
        mi.rememberByName(name, node);
    }
    static void setLists(OsHwMI& mi, std::vector<std::string> servers, std::vector<std::string> suffixes) {
        mi.dnsServers_ = std::move(servers);
        mi.dnsSuffixes_ = std::move(suffixes);
    }

    /// Of the steps of a pass that are called by name.
    static Pass& pass(OsHwMI& mi = myoshwmi) { return mi.pass_; }
    static bool networkMonitorEnded(OsHwMI& mi) { return mi.networkMonitorEnded_.wait(0); }

    /// Enough of the tree for drives and partitions: a disk controller with the first node id.
    static void plantDiskController(unsigned int firstNodeId) {
        myoshwmi.ManagementInterface::initialize(7, Number(1U), Number(firstNodeId));
        makeInventory(myoshwmi);
        myoshwmi.fixed.diskController =
            new MutableNode(myoshwmi.drawNodeId(), 1, myoshwmi.miIds(), NodeType::diskController, 1);
        myoshwmi.appendNode(myoshwmi.fixed.diskController);
    }
    static unsigned int diskControllerId() { return myoshwmi.fixed.diskController->getNodeId(); }
    static const std::vector<Node*>& drives() { return myoshwmi.driveNodes_; }
    static const std::vector<Node*>& partitions() { return myoshwmi.partitionNodes_; }
    static FingerprintPair& driveFingerprints() { return myoshwmi.driveFingerprints_; }
    static FingerprintPair& partitionFingerprints() { return myoshwmi.partitionFingerprints_; }
    static bool monitorRuns() { return myoshwmi.driveMonitorRuns_; }
    static bool monitorEndedWithin(unsigned long seconds) {
        return myoshwmi.driveMonitorEnded_.wait(seconds);
    }
    /// As unload does it.
    static void stopMonitor() {
        HardDriveNodeUpdate = true;
        myoshwmi.stopHardDriveMonitor();
    }
};

}  // namespace IC
