#include "storage/storage_builder.h"

#include <utility>

#include "mi/disk_snapshot.h"
#include "mi/log.h"
#include "mi/text.h"

namespace IC {

namespace {

/// Whether a line did not fit the buffer: the next read then gives its rest.
bool isCut(const std::string& line) {
    return line.size() == kCommandBuffer - 1 && line.back() != '\n';
}

/// The next line of a listing, without its line break. The rest of a line that is too long is skipped, or it
/// would be taken for the line of another device.
std::optional<std::string> nextEntry(HostCommand& listing) {
    const std::optional<std::string> line = listing.nextLine();
    for (std::optional<std::string> part = line; part && isCut(*part);) {
        part = listing.nextLine();
    }
    return line ? std::optional(trimEnd(*line)) : std::nullopt;
}

void withdrawStorageNodes(NodeTree& tree, const StorageKind& kind, std::vector<Node*>& nodes) {
    while (!nodes.empty()) {
        Node* const old = nodes.front();
        log(kProgress) << kind.withdrawnText << old->getDescription();
        // Off the list before deleteNode, in which the agent may throw: a node that is withdrawn is freed
        // with its last reader, so the list must not hold it any more.
        nodes.erase(nodes.begin());
        if (const Error result = tree.deleteNode(old); result.getStatus() != 0) {
            log(kError) << "deleteNode error = " << result;
        }
    }
}

void handOver(NodeTree& tree, std::unique_ptr<MutableNode> node, const StorageKind& kind,
              std::vector<Node*>& nodes, bool update) {
    Node* const built = node.get();
    nodes.push_back(built);
    try {
        if (update) {
            tree.publishNode(node.release());
            log(kProgress) << kind.publishedText;
        } else {
            tree.appendNode(node.release());
        }
    } catch (...) {
        // Whether the agent has it or not: a later update must not find it in the list.
        nodes.pop_back();
        tree.deleteNode(built);
        throw;
    }
}

}  // namespace

std::optional<std::string> askAboutLine(const Command& command) {
    HostCommand answer = startUnderFileLock(command);
    if (!answer.started()) {
        log(kError) << "Command : " << command.shown() << " failed!!";
        return std::nullopt;
    }
    return trimEnd(answer.nextLine().value_or(""));
}

void buildStorageNodes(NodeTree& tree, const StorageKind& kind, std::vector<Node*>& nodes, bool update) {
    if (update) {
        withdrawStorageNodes(tree, kind, nodes);
    }
    nodes.clear();
    if (!isDiskSnapshotOurs()) {
        return;  // as if the listing had printed nothing
    }
    HostCommand listing = startUnderFileLock(kind.listing);
    if (!listing.started()) {
        log(kError) << "fdisk command " << kind.listing.shown() << " failed!!";
        return;
    }
    while (const std::optional<std::string> line = nextEntry(listing)) {
        if (QX::Thread::isLeft()) {
            return;  // the agent has stopped us in the middle of our call to it
        }
        const auto index = static_cast<unsigned int>(nodes.size() + 1);
        if (std::unique_ptr<MutableNode> node = kind.build(tree, *line, index, update)) {
            handOver(tree, std::move(node), kind, nodes, update);
        }
    }
}

}  // namespace IC
