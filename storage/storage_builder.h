#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "framework/qx/event.h"
#include "framework/qx/thread.h"
#include "mi/command.h"
#include "mi/node_tree.h"
#include "storage/fingerprint.h"

namespace IC {

/// Builds the nodes of drives and partitions, and has a monitor build them anew when the disks change.
class StorageBuilder {
public:
    explicit StorageBuilder(NodeTree& tree) : tree_(tree) {}

    /// @param update withdraw the old nodes first and publish the new ones
    void createHardDriveNodes(bool update);
    void createPartitionNodes(bool update);

    void startHDDThread();
    void stopHardDriveMonitor();
    /// One comparison: what is different from the last one is built anew.
    void HDDThreadProcess();
    /// Takes the fingerprints of what the disk snapshot says now.
    /// @param keepCurrent false: they are what later passes compare with
    void HardDrive_Checksum(bool keepCurrent);
    void Partition_Checksum(bool keepCurrent);

    /// The nodes have left the tree with all others.
    void forgetStorageNodes();

private:
    friend struct OsHwMITestAccess;

    NodeTree& tree_;
    std::vector<Node*> driveNodes_;
    std::vector<Node*> partitionNodes_;
    FingerprintPair driveFingerprints_;
    FingerprintPair partitionFingerprints_;
    QX::Event driveMonitorEnded_{true};
    bool driveMonitorRuns_ = false;
    /// The last member: a monitor that nobody stopped ends before what it uses is gone.
    std::unique_ptr<QX::Thread> driveMonitor_;
};

/// What differs between drives and partitions; buildStorageNodes does what they have in common.
struct StorageKind {
    Command listing;            ///< the command that prints one line per candidate
    const char* withdrawnText;  ///< logged before the description of a node that goes
    const char* publishedText;
    /// Makes the node of one line, which carries no line break; null when the line gives none.
    std::unique_ptr<MutableNode> (*build)(NodeTree& tree, const std::string& line, unsigned int index,
                                          bool update);
};

/// Each line of the listing may give a node.
/// @param nodes those of the kind that are in the tree
/// @param update withdraw the old nodes first and publish the new ones
void buildStorageNodes(NodeTree& tree, const StorageKind& kind, std::vector<Node*>& nodes, bool update);

/// The first line that a command about one line of the listing prints, without its line break, "" when it
/// prints none. Nothing when it could not be started: that is logged, and the line it is about is skipped.
std::optional<std::string> askAboutLine(const Command& command);

}  // namespace IC
