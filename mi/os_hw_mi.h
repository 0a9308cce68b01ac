#pragma once

#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "framework/ic/management_interface.h"
#include "framework/netinfo/records.h"
#include "framework/qx/event.h"
#include "framework/qx/thread.h"
#include "mi/fingerprint.h"
#include "mi/inventory.h"

namespace IC {

class CLANEndPointNode;
class NetworkMonitor;
class PortWalk;
struct ListedInterface;

/// The plug-in object: builds the tree of the host's nodes, starts and stops the monitors. There is one,
/// myoshwmi. Each builder lives in the room of the nodes it builds; initialize calls them in a fixed order.
class OsHwMI : public ManagementInterface {
public:
    OsHwMI();
    ~OsHwMI() override;

    /// Builds the tree and starts the monitors. A step that fails is logged and the next one runs.
    /// @return the result of the base class's initialize
    Error initialize(unsigned int miId, const Number& ownNodeId, const Number& firstNodeId) override;
    /// Stops the monitors, empties the list of nodes, removes the plug-in's own files. Safe without an
    /// initialize before it. The nodes themselves live as long as this object.
    Error unload() override;

    /// Hands a node made after start-up to the agent. A refusal is logged and not retried.
    void publishNode(Node* node);

    // The static tree (mi/static_tree.cpp; the computer in computer/).
    void createOsHwNodes();
    void createRootNode();
    void createComputerNodes();
    void createChassisNodes();
    void createPlanarNodes();
    void createNetworkControllerNodes();
    void createDiskControllerNodes();

    // computer/
    void updateHostAndDomainName();
    void vpdUpdate();

    // storage/ — `update`: withdraw the old nodes first and publish the new ones
    void createHardDriveNodes(bool update);
    void createPartitionNodes(bool update);
    void startHDDThread();
    void HDDThreadProcess();
    void HardDrive_Checksum(bool keepCurrent);
    void Partition_Checksum(bool keepCurrent);

    // network/ — the flag is accepted and not read: first build and rebuild run the same walk
    void createNetworkPortNodes(bool update);
    void createNetworkTeamingNodes();
    void createLANEndPointNodes();
    void createIPConfigNodes(std::vector<CIPInfo*>* addresses, std::string name, MutableNode* parent,
                             unsigned int& index);
    void stringFormatForDNSServersAndSuffixes(std::string& servers, std::string& suffixes);
    /// Looks an interface up among the published nodes. @param node receives the node when there is one
    bool findNetworkPort(std::string name, MutableNode** node) const;

    // indications/
    void enableIndications();
    void disableIndications();
    void createCurNetNodeMap();
    unsigned int bondedNetNodeStatus(const std::string& bond);
    void writePrevNetNodeMap();
    void readPrevNetNodeMap();
    void checkAndSendNetAlert();

    // cpu/ — the agent may call createCpuNodes; nothing in the plug-in does
    void createCpuNodeAndMap();
    __attribute__((visibility("default"))) void createCpuNodes();

private:
    friend struct OsHwMITestAccess;
    struct StorageKind;  // storage/storage_build.h

    /// Takes the next node id and remembers it as drawn.
    unsigned int drawNodeId();
    /// Makes a node of the next id under `parent`. The caller lists it (appendNode) or publishes it.
    template <class NodeT, class... More>
    NodeT* makeNode(const MutableNode* parent, unsigned int type, unsigned int index, More&&... more) {
        return new NodeT(drawNodeId(), idOf(parent), miIds(), type, index, std::forward<More>(more)...);
    }
    MutableNode* createStaticNode(const MutableNode* parent, unsigned int type, unsigned int index,
                                  const char* description);
    /// An interface that is known already keeps its node.
    void rememberByName(const std::string& name, MutableNode* node);
    /// A copy: the walk over the interfaces and the network monitor run at the same time.
    std::map<std::string, std::shared_ptr<MutableNode>> nodesByName() const;
    std::shared_ptr<MutableNode> findNetworkPort(const std::string& name) const;  ///< held; null for none
    void stopMonitors();
    void stopHardDriveMonitor();
    Error emptyTree();
    /// What a bond member's change since the last pass means for the bond (indications/).
    unsigned int memberVerdict(const std::string& member) const;
    void sendAlert(const Alert& alert);
    CLANEndPointNode* createLANEndPoint(const std::string& name, unsigned int parent, unsigned int index);
    // Steps of createNetworkPortNodes (network/).
    void walkInterfaces();
    void visitInterface(const ListedInterface& interface, const PortWalk& walk,
                        std::map<std::string, std::string> settings, unsigned int& index);
    MutableNode* createPort(const std::string& name, unsigned int index);
    MutableNode* createIPConfig(const ListedInterface& interface, const MutableNode& parent,
                                const PortWalk& walk, unsigned int index,
                                std::map<std::string, std::string>& settings);
    /// The frame of both storage builders: the old nodes go, each line of the listing may give a new one.
    void buildStorageNodes(const StorageKind& kind, bool update);
    void withdrawStorageNodes(const StorageKind& kind);
    void handOver(std::unique_ptr<MutableNode> node, const StorageKind& kind, bool update);
    std::unique_ptr<MutableNode> buildHardDrive(const std::string& line, unsigned int index, bool update);
    std::unique_ptr<MutableNode> buildPartition(const std::string& line, unsigned int index, bool update);

    mutable std::mutex inventoryGuard_;   ///< guards drawnIds and nodesByName
    std::optional<Inventory> inventory_;  ///< from initialize to unload
    int initializing_ = 0;                ///< 1 once initialize was called

    StaticTree tree_;
    std::vector<Node*> driveNodes_;
    std::vector<Node*> partitionNodes_;
    QX::Event driveMonitorEnded_{true};
    bool driveMonitorRuns_ = false;
    FingerprintPair driveFingerprints_;
    FingerprintPair partitionFingerprints_;

    QX::Event networkMonitorEnded_{true};
    NetworkMonitor* networkMonitor_ = nullptr;
    std::string hostName_;
    std::string domainName_;
    /// One walk or builder of processors at a time, and none while the nodes go; guards the lists below.
    std::mutex portWalkGuard_;
    std::vector<std::string> dnsServers_;
    std::vector<std::string> dnsSuffixes_;
    /// The last member: a monitor that nobody stopped ends before what it uses is gone.
    std::unique_ptr<QX::Thread> driveMonitor_;
};

}  // namespace IC
