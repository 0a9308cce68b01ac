#pragma once

#include <atomic>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <utility>
#include <vector>

#include "framework/ic/management_interface.h"

namespace IC {

/// The nodes of the fixed upper levels, for whoever hangs nodes under them. Null outside initialize and
/// unload, and where a builder failed.
struct StaticTree {
    MutableNode* osHw = nullptr;
    MutableNode* root = nullptr;
    MutableNode* computer = nullptr;
    MutableNode* chassis = nullptr;
    MutableNode* planar = nullptr;
    MutableNode* networkController = nullptr;
    MutableNode* diskController = nullptr;
};

/// The id of a node that another one is to hang under. Throws when there is none.
unsigned int idOf(const MutableNode* parent);

/// The tree of nodes, and what the builders of all components need of it and of each other.
class NodeTree : public ManagementInterface {
public:
    using ManagementInterface::alertHandler;
    using ManagementInterface::appendNode;
    using ManagementInterface::miIds;
    /// Hands a node made after start-up to the agent. A refusal is logged and not retried.
    void publishNode(Node* node);

    void createOsHwNodes();
    void createRootNode();
    void createChassisNodes();
    void createPlanarNodes();
    void createNetworkControllerNodes();
    void createDiskControllerNodes();  ///< takes the disk snapshot as well

    /// Asks `hostname`; a name that it does not tell stays as it was.
    void updateHostAndDomainName();

    /// Takes the next node id and remembers it as drawn.
    unsigned int drawNodeId();
    /// Makes a node of the next id under `parent`. The caller lists it (appendNode) or publishes it.
    template <class NodeT, class... More>
    NodeT* makeNode(const MutableNode* parent, unsigned int type, unsigned int index, More&&... more) {
        return new NodeT(drawNodeId(), idOf(parent), miIds(), type, index, std::forward<More>(more)...);
    }
    /// An interface that is known already keeps its node.
    void rememberByName(const std::string& name, MutableNode* node);
    /// A copy: the walk over the interfaces and the network monitor run at the same time.
    std::map<std::string, std::shared_ptr<MutableNode>> nodesByName() const;
    std::shared_ptr<MutableNode> findNetworkPort(const std::string& name) const;  ///< held; null for none
    /// @param node receives the interface's node when there is one
    bool findNetworkPort(std::string name, MutableNode** node) const;

    StaticTree fixed;
    std::string hostName;    ///< as the command printed it
    std::string domainName;  ///< as the command printed it
    /// One walk or builder of processors at a time, and none while the nodes go.
    std::mutex building;

protected:
    /// Forgets the nodes' ids and names.
    /// @param keeps whether new ones are remembered: from initialize to unload
    void resetInventory(bool keeps);
    bool hasInventory() const { return keepsInventory_; }

private:
    friend struct OsHwMITestAccess;

    MutableNode* createStaticNode(const MutableNode* parent, unsigned int type, unsigned int index,
                                  const char* description);

    mutable std::mutex inventoryGuard_;  ///< guards everything below
    std::atomic<bool> keepsInventory_{false};
    std::vector<unsigned int> drawnIds_;                             ///< every id taken from the counter
    std::map<std::string, std::weak_ptr<MutableNode>> nodesByName_;  ///< by interface, bonds included
};

}  // namespace IC
