#include <cstdlib>

#include "mi/log.h"
#include "mi/node_types.h"
#include "mi/text.h"
#include "storage/storage_builder.h"
#include "storage/storage_nodes.h"

namespace IC {

namespace {

namespace DriveId {
enum : unsigned int {
    driveSize = 37,     ///< number, 64 bits: thousands of bytes
    devicePath = 89,    ///< text
    healthState = 123,  ///< number: always 1
};
}  // namespace DriveId

constexpr Property kDriveProperties[] = {
    {DriveId::healthState, healthOf},
};
static_assert(idsAscend(kDriveProperties));

/// Disks proper. Software RAID and mapper devices are listed like disks but are none.
bool isDrive(const std::string& device) {
    return contains(device, "/dev/sd") || contains(device, "/dev/hd");
}

/// Bytes as fdisk prints them, in thousands. A text that is no number counts as 0, and so does what no size
/// can be (converting it would be undefined).
unsigned long long thousandsOfBytes(const std::string& text) {
    constexpr double end = 18446744073709551616.0;  // 2^64
    const double bytes = std::strtod(text.c_str(), nullptr);
    return bytes > 0 && bytes < end ? static_cast<unsigned long long>(bytes) / 1000 : 0;
}

void fillDrive(HardDriveNode& node, const std::string& sizeInBytes) {
    const std::string& device = node.name();
    node.setProperty(DriveId::devicePath, PropertyValue(device, true));
    node.setProperty(DriveId::driveSize, PropertyValue(Number(thousandsOfBytes(sizeInBytes)), true));
    PropertyValue health;
    node.getProperty(DriveId::healthState, health);
    node.setProperty(DriveId::healthState, health);
    if (health == PropertyValue(Number(1U), true)) {
        log(kProgress) << "Hard Drive Node::Normal " << device;
    }
}

std::unique_ptr<MutableNode> buildHardDrive(NodeTree& tree, const std::string& line, unsigned int index,
                                            bool update) {
    const auto answer = askAboutLine(formatCommand("echo \"%s\" | cut -d \" \" -f2", line));
    const std::string device = trimEnd(answer.value_or(""), ':');
    if (!isDrive(device)) {
        return nullptr;
    }
    std::unique_ptr<HardDriveNode> node(
        tree.makeNode<HardDriveNode>(tree.fixed.diskController, NodeType::hardDrive, index, device));
    log(kProgress) << (update ? "Hard Drive Update created " : "New Hard Drive Node created ") << device;
    node->setDescription("Hard Drive");
    node->setStatus(kStatusGood);
    const auto size = askAboutLine(formatCommand("echo \"%s\" | cut -d \" \" -f5", line));
    if (!size) {
        return nullptr;
    }
    fillDrive(*node, *size);
    return node;
}

constexpr StorageKind kDriveKind = {
    .listing = "cat /tmp/fdisk_tmp | grep ^Disk",
    // Misspelt: readers of the log search for it as it is.
    .withdrawnText = "Delete a Hrad Drive entry: ",
    .publishedText = "Updated Hard Drive Node Published",
    .build = buildHardDrive,
};

}  // namespace

constinit const NodeClass hardDriveClass{"~HardDriveNode", kDriveProperties};

void StorageBuilder::createHardDriveNodes(bool update) {
    const LogScope scope;
    buildStorageNodes(tree_, kDriveKind, driveNodes_, update);
}

}  // namespace IC
