#include "storage/storage_build.h"

#include <utility>

#include "mi/disk_snapshot.h"
#include "mi/log.h"
#include "mi/text.h"

namespace IC {

std::optional<std::string> askAboutLine(const std::optional<std::string>& command) {
    HostCommand answer = startUnderFileLock(command);
    if (!answer.started()) {
        log(kError) << "Command : " << command.value_or("") << " failed!!";
        return std::nullopt;
    }
    return trimEnd(answer.nextLine().value_or(""));
}

void OsHwMI::buildStorageNodes(const StorageKind& kind, bool update) {
    std::vector<Node*>& nodes = this->*kind.nodes;
    // The framework owns the nodes and frees one when its last reader has gone; the list is emptied first, so
    // that it never holds a pointer to a node that has been withdrawn.
    for (Node* old : std::exchange(nodes, {})) {
        if (update) {
            log(kProgress) << kind.withdrawnText << old->getDescription();
            deleteNode(old);
        }
    }
    HostCommand listing = startUnderFileLock(kind.listing);
    if (!listing.started()) {
        log(kError) << "fdisk command " << kind.listing << " failed!!";
        return;
    }
    while (const std::optional<std::string> line = listing.nextLine()) {
        const auto index = static_cast<unsigned int>(nodes.size() + 1);
        std::unique_ptr<MutableNode> node = (this->*kind.build)(trimEnd(*line), index, update);
        if (node) {
            nodes.push_back(node.get());
            handOver(std::move(node), kind, update);
        }
    }
}

void OsHwMI::handOver(std::unique_ptr<MutableNode> node, const StorageKind& kind, bool update) {
    if (!update) {
        appendNode(node.release());
        return;
    }
    publishNode(node.release());
    log(kProgress) << kind.publishedText;
}

}  // namespace IC
