#include "storage/storage_build.h"

#include <utility>

#include "mi/disk_snapshot.h"
#include "mi/log.h"
#include "mi/text.h"

namespace IC {

namespace {

/// Whether a line did not fit the buffer it was read into: its rest comes next.
bool isCut(const std::string& line) {
    return line.size() == kCommandBuffer - 1 && line.back() != '\n';
}

/// The next line of a listing, without its line break. Of one that is too long the rest is passed over: it
/// would be taken for a line of its own, and so for a device that the host does not have.
std::optional<std::string> nextEntry(HostCommand& listing) {
    const std::optional<std::string> line = listing.nextLine();
    for (std::optional<std::string> part = line; part && isCut(*part);) {
        part = listing.nextLine();
    }
    return line ? std::optional(trimEnd(*line)) : std::nullopt;
}

}  // namespace

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
    while (const std::optional<std::string> line = nextEntry(listing)) {
        const auto index = static_cast<unsigned int>(nodes.size() + 1);
        std::unique_ptr<MutableNode> node = (this->*kind.build)(*line, index, update);
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
