#include <algorithm>
#include <limits>

#include "mi/log.h"
#include "mi/node_types.h"
#include "mi/text.h"
#include "storage/storage_builder.h"
#include "storage/storage_nodes.h"

namespace IC {

namespace {

namespace PartitionId {
enum : unsigned int {
    devicePath = 89,        ///< text
    partitionName = 108,    ///< text: the device path again
    partitionBlocks = 112,  ///< number, 64 bits: blocks of 1024 bytes
    healthState = 123,      ///< number: always 1
};
}  // namespace PartitionId

constexpr Property kPartitionProperties[] = {
    {PartitionId::healthState, healthOf},
};
static_assert(idsAscend(kPartitionProperties));

std::string firstToken(const std::string& line) {
    const std::string text = trimStart(line);
    return text.substr(0, text.find(' '));
}

/// Blocks as fdisk prints them. The value goes through the host's own `long`: where that has 32 bits a
/// partition of 2 TiB or more stays at 2147483647, the number that agents of such hosts have always been
/// shown.
unsigned long long blocks(const std::string& text) {
    return static_cast<unsigned long long>(std::clamp<long long>(
        leadingDecimal(text), std::numeric_limits<long>::min(), std::numeric_limits<long>::max()));
}

std::unique_ptr<MutableNode> buildPartition(NodeTree& tree, const std::string& line, unsigned int index,
                                            bool) {
    const std::string device = firstToken(line);
    std::unique_ptr<DiskPartition> node(
        tree.makeNode<DiskPartition>(tree.fixed.diskController, NodeType::partition, index, device));
    node->setStatus(kStatusGood);
    node->setDescription("Partition");
    node->setProperty(PartitionId::devicePath, PropertyValue(device, true));
    node->setProperty(PartitionId::partitionName, PropertyValue(device, true));
    const auto answer = askAboutLine(formatCommand("echo \"%s\" |  tr -s '*' ' '  | cut -d ' ' -f4", line));
    if (!answer) {
        return nullptr;
    }
    const std::string size = trimEnd(*answer, '+');
    log(kProgress) << "Partition blocksize : " << size;
    const unsigned long long number = blocks(size);
    log(kProgress) << "Partition blocksize in Uint64 : " << number;
    node->setProperty(PartitionId::partitionBlocks, PropertyValue(Number(number), true));
    return node;
}

constexpr StorageKind kPartitionKind = {
    .listing = "cat /tmp/fdisk_tmp | grep ^/dev",
    .withdrawnText = "Delete a Partition entry: ",
    .publishedText = "Partition Node Published",
    .build = buildPartition,
};

}  // namespace

constinit const NodeClass diskPartitionClass{"~DiskPartition", kPartitionProperties};

void StorageBuilder::createPartitionNodes(bool update) {
    const LogScope scope;
    buildStorageNodes(tree_, kPartitionKind, partitionNodes_, update);
}

}  // namespace IC
