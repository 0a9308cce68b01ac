#include "framework/ic/management_interface.h"

#include <algorithm>
#include <exception>
#include <mutex>

#include "framework/ic/conversion_error.h"

namespace IC {
namespace {

Error failed(const std::string& text) {
    return {Error::failure, Number(), text};
}

/// The value of one of initialize's ids; ConversionError when there is none.
unsigned int requiredId(const Number& number, const char* what) {
    if (number.empty()) {
        throw ConversionError(std::string("initialize: no ") + what + " given");
    }
    return number;
}

/// What the agent throws at a node is a failure with that node alone.
template <class Call>
Error tell(const Call& call) {
    try {
        return call();
    } catch (const std::exception& failure) {
        return failed(failure.what());
    } catch (...) {
        return failed("unknown exception");
    }
}

using NodeList = std::list<std::shared_ptr<MutableNode>>;

/// Takes a node out of a list; an empty handle when it is not in there.
std::shared_ptr<MutableNode> takeOut(NodeList& nodes, const Node* node) {
    const auto found = std::find_if(nodes.begin(), nodes.end(),
                                    [node](const auto& candidate) { return candidate.get() == node; });
    if (found == nodes.end()) {
        return {};
    }
    auto taken = std::move(*found);
    nodes.erase(found);
    return taken;
}

}  // namespace

ManagementInterface::ManagementInterface() = default;
ManagementInterface::~ManagementInterface() = default;

Error ManagementInterface::getMap(std::vector<Node*>& nodes) {
    nodes.clear();
    const std::shared_lock lock(guard_);
    nodes.reserve(nodes_.size());
    for (const auto& node : nodes_) {
        nodes.push_back(node.get());
    }
    return {};
}

Error ManagementInterface::initialize(unsigned int miId, const Number& ownNodeId, const Number& firstNodeId) {
    try {
        const unsigned int own = requiredId(ownNodeId, "id of the interface's own node");
        const unsigned int first = requiredId(firstNodeId, "first node id");
        const std::unique_lock lock(guard_);
        miIds_ = {miId};
        ownNodeId_ = own;
        nextNodeId_ = first;
        return {};
    } catch (const ConversionError& error) {
        return failed(error.what());
    }
}

Error ManagementInterface::registerForAlerts(AlertHandler handler, const void* context) {
    const std::unique_lock lock(guard_);
    alertHandler_ = handler;
    alertContext_ = context;
    return {};
}

Error ManagementInterface::deRegisterForAlerts() {
    return ManagementInterface::registerForAlerts(nullptr, nullptr);
}

Error ManagementInterface::unload() {
    const std::unique_lock lock(guard_);
    unloaded_.splice(unloaded_.end(), nodes_);
    unloaded_.splice(unloaded_.end(), refused_);
    return {};
}

ManagementInterface::operator std::string() const {
    const std::shared_lock lock(guard_);
    return "management interface (node " + std::to_string(ownNodeId_) + ", " + std::to_string(nodes_.size()) +
           " nodes)";
}

std::shared_ptr<MutableNode> ManagementInterface::list(MutableNode* node) {
    const std::unique_lock lock(guard_);
    auto handle = node->weak_from_this().lock();
    if (!handle) {
        handle.reset(node);
    }
    takeOut(refused_, node);  // the agent is asked again
    takeOut(unloaded_, node);
    if (std::find(nodes_.begin(), nodes_.end(), handle) == nodes_.end()) {
        nodes_.push_back(handle);
    }
    return handle;
}

void ManagementInterface::refuse(const std::shared_ptr<MutableNode>& node) {
    const std::unique_lock lock(guard_);
    if (takeOut(nodes_, node.get())) {  // unless it was withdrawn meanwhile
        refused_.push_back(node);
    }
}

Error ManagementInterface::addNewNode(Node* node) {
    auto* const mutableNode = dynamic_cast<MutableNode*>(node);
    if (mutableNode == nullptr) {
        return failed("addNewNode: not a node of a plug-in");
    }
    LoadCallBack load = nullptr;
    const void* context = nullptr;
    {
        const std::shared_lock lock(guard_);
        load = load_;
        context = loadContext_;
    }
    const auto handle = list(mutableNode);
    if (load == nullptr) {
        return {};  // the agent finds it in the map
    }
    Error result = tell([&] { return load(node, context); });
    if (result.getStatus() != Error::success) {
        refuse(handle);
    }
    return result;
}

Error ManagementInterface::deleteNode(Node* node) {
    std::shared_ptr<MutableNode> listed;
    std::shared_ptr<MutableNode> unlisted;
    void (*withdrawn)(const Node&, const void*) = nullptr;
    const void* context = nullptr;
    {
        const std::unique_lock lock(guard_);
        listed = takeOut(nodes_, node);
        unlisted = takeOut(refused_, node);
        unlisted = unlisted ? unlisted : takeOut(unloaded_, node);
        withdrawn = withdrawn_;
        context = withdrawnContext_;
    }
    if (!listed && !unlisted) {
        return failed("deleteNode: no such node");
    }
    Error result;
    if (listed && withdrawn != nullptr) {
        result = tell([&] {
            withdrawn(*listed, context);
            return Error();
        });
    }
    return result;
}

Node* ManagementInterface::getNode(unsigned int nodeId) const {
    return hold(nodeId).get();
}

std::shared_ptr<MutableNode> ManagementInterface::hold(unsigned int nodeId) const {
    const std::shared_lock lock(guard_);
    const auto found = std::find_if(nodes_.begin(), nodes_.end(),
                                    [nodeId](const auto& node) { return node->getNodeId() == nodeId; });
    return found == nodes_.end() ? nullptr : *found;
}

std::vector<std::shared_ptr<MutableNode>> ManagementInterface::holdAll() const {
    const std::shared_lock lock(guard_);
    return {nodes_.begin(), nodes_.end()};
}

void ManagementInterface::setWithdrawCallBack(void (*withdrawn)(const Node& node, const void* context),
                                              const void* context) {
    const std::unique_lock lock(guard_);
    withdrawn_ = withdrawn;
    withdrawnContext_ = context;
}

void ManagementInterface::appendNode(MutableNode* node) {
    if (node != nullptr) {
        list(node);
    }
}

unsigned int ManagementInterface::takeNodeId() {
    const std::unique_lock lock(guard_);
    return nextNodeId_++;
}

unsigned int ManagementInterface::ownNodeId() const {
    const std::shared_lock lock(guard_);
    return ownNodeId_;
}

std::vector<unsigned int> ManagementInterface::miIds() const {
    const std::shared_lock lock(guard_);
    return miIds_;
}

std::pair<AlertHandler, const void*> ManagementInterface::alertHandler() const {
    const std::shared_lock lock(guard_);
    return {alertHandler_, alertContext_};
}

}  // namespace IC
