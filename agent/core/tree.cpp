#include "agent/core/tree.h"

#include <algorithm>
#include <functional>
#include <optional>
#include <set>

#include "agent/core/problem.h"
#include "framework/qx/whole_number.h"

namespace cvagent {

namespace {

using Finder = std::function<Handle(unsigned int)>;

constexpr int kDeepest = 64;  // parents that form a circle end here

std::string pathOf(const IC::MutableNode& node, const Finder& parentOf, int depth = 0) {
    const Handle parent = depth < kDeepest ? parentOf(node.getLinkedId()) : nullptr;
    const std::string above = parent ? pathOf(*parent, parentOf, depth + 1) : std::string();
    return above + "/" + pathComponent(node);
}

/// Whether a person's word means the node: its whole path or the last part of it.
bool isMeant(const IC::MutableNode& node, const std::string& text) {
    return text.starts_with('/') ? node.getPath() == text : pathComponent(node) == text;
}

/// Whether the word is the name in the last part of the path: "eth0" of "network-port:eth0".
bool isNamed(const IC::MutableNode& node, const std::string& text) {
    return pathComponent(node).ends_with(":" + text);
}

std::vector<Handle> matching(const std::vector<Handle>& nodes, const std::string& text,
                             bool (*matches)(const IC::MutableNode&, const std::string&)) {
    std::vector<Handle> found;
    std::copy_if(nodes.begin(), nodes.end(), std::back_inserter(found),
                 [&](const Handle& node) { return matches(*node, text); });
    return found;
}

Handle withId(const std::vector<Handle>& nodes, unsigned int id) {
    const auto found = std::find_if(nodes.begin(), nodes.end(),
                                    [id](const Handle& node) { return node->getNodeId() == id; });
    return found == nodes.end() ? nullptr : *found;
}

[[noreturn]] void failAmbiguous(const std::string& text, const std::vector<Handle>& candidates) {
    std::string list;
    for (const Handle& node : candidates) {
        list += "\n  " + std::to_string(node->getNodeId()) + "  " + node->getPath();
    }
    throw Problem(Problem::ambiguous,
                  "'" + text + "' is the name of " + std::to_string(candidates.size()) + " nodes",
                  Problem::node, list);
}

}  // namespace

std::string makePath(const IC::ManagementInterface& interface, const IC::MutableNode& node) {
    return pathOf(node, [&interface](unsigned int id) { return interface.hold(id); });
}

void setPaths(const IC::ManagementInterface& interface) {
    const std::vector<Handle> nodes = interface.holdAll();
    std::map<unsigned int, Handle> byId;
    for (const Handle& node : nodes) {
        byId.emplace(node->getNodeId(), node);
    }
    const Finder find = [&byId](unsigned int id) {
        const auto found = byId.find(id);
        return found == byId.end() ? Handle() : found->second;
    };
    for (const Handle& node : nodes) {
        node->setPath(pathOf(*node, find));
    }
}

Handle findNode(const NodesOfEach& plugins, const std::string& text) {
    if (const std::optional<unsigned int> id = QX::wholeNumber<unsigned int>(text)) {
        for (const std::vector<Handle>& nodes : plugins) {
            if (Handle node = withId(nodes, *id)) {
                return node;
            }
        }
        throw Problem(Problem::notFound, "there is no node with the id " + text, Problem::node);
    }
    for (const auto matches : {isMeant, isNamed}) {
        for (const std::vector<Handle>& nodes : plugins) {
            const std::vector<Handle> found =
                text.empty() ? std::vector<Handle>() : matching(nodes, text, matches);
            if (found.size() > 1) {
                failAmbiguous(text, found);
            }
            if (!found.empty()) {
                return found.front();
            }
        }
    }
    throw Problem(Problem::notFound, "there is no node '" + text + "'", Problem::node);
}

Handle findNode(const std::vector<Handle>& nodes, const std::string& text) {
    return findNode(NodesOfEach{nodes}, text);
}

Handle findNode(const IC::ManagementInterface& interface, const std::string& text) {
    return findNode(interface.holdAll(), text);
}

std::vector<Placed> drawingOrder(const std::vector<NodeRef>& nodes) {
    std::set<unsigned int> ids;
    for (const NodeRef& node : nodes) {
        ids.insert(node->getNodeId());
    }
    std::map<unsigned int, std::vector<NodeRef>> children;  // of parent 0: the nodes at the top
    for (const NodeRef& node : nodes) {
        const unsigned int parent = node->getLinkedId();
        const bool hangs = ids.contains(parent) && parent != node->getNodeId();
        children[hangs ? parent : 0].push_back(node);
    }
    std::vector<Placed> order;
    const std::function<void(unsigned int, const std::vector<bool>&)> place =
        [&](unsigned int parent, const std::vector<bool>& above) {
            const std::vector<NodeRef> siblings = std::move(children[parent]);  // a circle is walked once
            children[parent].clear();
            for (const NodeRef& node : siblings) {
                std::vector<bool> last = above;
                last.push_back(node == siblings.back());
                order.push_back({node, last});
                if (node->getNodeId() != 0) {
                    place(node->getNodeId(), last);
                }
            }
        };
    place(0, {});
    for (const auto& [parent, circle] : children) {
        if (!circle.empty()) {
            place(parent, {});
        }
    }
    return order;
}

}  // namespace cvagent
