#pragma once

#include <memory>
#include <vector>

#include "framework/qx/event.h"
#include "framework/qx/thread.h"
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

}  // namespace IC
