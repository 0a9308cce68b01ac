#pragma once

#include <map>
#include <string>
#include <vector>

#include "framework/netinfo/records.h"
#include "mi/node_tree.h"

namespace IC {

class PortWalk;
struct ListedInterface;

/// Builds the nodes of ports, their IP configurations, LAN endpoints and teams.
class NetworkBuilder {
public:
    explicit NetworkBuilder(NodeTree& tree) : tree_(tree) {}

    /// A node for each interface that has none yet, and its settings saved. One walk at a time; nothing
    /// outside initialize and unload. The flag is not read: first build and rebuild are the same walk.
    void createNetworkPortNodes(bool update);
    void createNetworkTeamingNodes();
    /// Nothing in the plug-in calls it.
    void createLANEndPointNodes();
    void createIPConfigNodes(std::vector<CIPInfo*>* addresses, std::string name, MutableNode* parent,
                             unsigned int& index);
    /// Appends what the last walk found, each name with a blank behind it.
    void stringFormatForDNSServersAndSuffixes(std::string& servers, std::string& suffixes);

private:
    friend struct OsHwMITestAccess;

    void walkInterfaces();
    void visitInterface(const ListedInterface& interface, const PortWalk& walk,
                        std::map<std::string, std::string> settings, unsigned int& index);
    MutableNode* createPort(const std::string& name, unsigned int index);
    MutableNode* createIPConfig(const ListedInterface& interface, const MutableNode& parent,
                                const PortWalk& walk, unsigned int index,
                                std::map<std::string, std::string>& settings);

    NodeTree& tree_;
    // Guarded by the tree's `building`.
    std::vector<std::string> dnsServers_;
    std::vector<std::string> dnsSuffixes_;
};

}  // namespace IC
