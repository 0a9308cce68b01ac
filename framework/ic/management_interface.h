#pragma once

#include <functional>
#include <list>
#include <memory>
#include <mutex>
#include <shared_mutex>
#include <string>
#include <utility>
#include <vector>

#include "framework/export.h"
#include "framework/ic/alert.h"
#include "framework/ic/mutable_node.h"

namespace IC {

using AlertHandler = Error (*)(const std::vector<Alert>& alerts, const void* context);
using LoadCallBack = Error (*)(Node* const& node, const void* context);
using FindCallBack = Error (*)(const std::string& name, Node** node);

/// What a plug-in is to the agent: the list of its nodes, start and stop, the way for alerts. All operations
/// may be called from many threads at once; no lock is held while a callback of the agent runs. The order of
/// the virtual operations is part of the binary contract between agent and plug-in.
class CORVISTA_API ManagementInterface {
public:
    ManagementInterface();
    ManagementInterface(const ManagementInterface&) = delete;
    ManagementInterface& operator=(const ManagementInterface&) = delete;

    /// Fills `nodes` with the nodes of the list. A pointer stays good until the node is withdrawn or this
    /// object goes, also over unload; a reader on another thread than the one that withdraws uses hold() or
    /// holdAll().
    virtual Error getMap(std::vector<Node*>& nodes);
    /// @param miId id of this interface, @param ownNodeId id of the interface's node,
    /// @param firstNodeId where the node-id counter starts. Failure when a number is none.
    virtual Error initialize(unsigned int miId, const Number& ownNodeId, const Number& firstNodeId);
    /// Callbacks stay registered until others take their place, also over unload and a new initialize.
    virtual Error registerForAlerts(AlertHandler handler, const void* context);
    virtual void setLoadCallBack(LoadCallBack load, const void* context, FindCallBack find) {
        std::unique_lock lock(guard_);
        load_ = load;
        loadContext_ = context;
        find_ = find;
    }
    virtual Error deRegisterForAlerts();
    /// Empties the list. The nodes themselves live on, for whoever still has a pointer.
    virtual Error unload();
    virtual ~ManagementInterface();
    virtual operator std::string() const;
    /// Takes ownership of a node made after start-up, lists it and hands it to the agent's load callback,
    /// whose result it returns; one that throws has refused. A node that the agent refuses stays owned but is
    /// not listed. A node that is owned already is handed over again. Failure for null and for a node that is
    /// no MutableNode; it stays the caller's.
    virtual Error addNewNode(Node* node);
    /// Withdraws a node: out of the list at once, freed when the last operation on it has returned.
    /// Failure when the node is not one of this interface's, or when the agent threw on hearing of it.
    virtual Error deleteNode(Node* node);
    /// The node with that id, or null. See getMap for how long the pointer is good.
    virtual Node* getNode(unsigned int nodeId) const;

    /// A handle that keeps the node alive across its withdrawal; empty when there is none with that id.
    std::shared_ptr<MutableNode> hold(unsigned int nodeId) const;
    std::vector<std::shared_ptr<MutableNode>> holdAll() const;
    /// `withdrawn` hears of every listed node taken out with deleteNode, on the thread that withdraws it.
    void setWithdrawCallBack(void (*withdrawn)(const Node& node, const void* context), const void* context);

protected:
    /// Takes ownership of a start-up node and lists it; null and a node that is listed already change
    /// nothing.
    void appendNode(MutableNode* node);
    /// The next free node id; the counter advances by one.
    unsigned int takeNodeId();
    unsigned int ownNodeId() const;
    std::vector<unsigned int> miIds() const;
    /// The registered alert callback with its context; null when none is registered.
    std::pair<AlertHandler, const void*> alertHandler() const;

private:
    using NodeList = std::list<std::shared_ptr<MutableNode>>;

    std::shared_ptr<MutableNode> list(MutableNode* node);
    void refuse(const std::shared_ptr<MutableNode>& node);

    mutable std::shared_mutex guard_;  // guards everything below
    unsigned int nextNodeId_ = 1;
    unsigned int ownNodeId_ = 0;
    std::vector<unsigned int> miIds_;
    NodeList nodes_;
    NodeList refused_;   // owned, but the agent would not have them
    NodeList unloaded_;  // owned, but of an earlier start
    AlertHandler alertHandler_ = nullptr;
    const void* alertContext_ = nullptr;
    LoadCallBack load_ = nullptr;
    const void* loadContext_ = nullptr;
    FindCallBack find_ = nullptr;
    void (*withdrawn_)(const Node&, const void*) = nullptr;
    const void* withdrawnContext_ = nullptr;
};

}  // namespace IC
