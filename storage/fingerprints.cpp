// The fingerprints of the disk snapshot, and what a pass of the drive monitor does with them.
#include "mi/disk_snapshot.h"
#include "mi/log.h"
#include "mi/my_process.h"
#include "mi/text.h"
#include "storage/storage_builder.h"

namespace IC {

namespace {

struct Digest {
    Command command;
    const char* logged;
};

/// The lines of the snapshot that describe one kind of node: how they are digested, and what the log says.
struct Extract {
    const char* different;
    Digest md5;
    Digest sha1;
};

constexpr Extract kDrives = {
    .different = "Hard Drive Check Sum found Different",
    .md5 = {"cat /tmp/fdisk_tmp | grep ^Disk |md5sum |awk '{print $1}'",
            "cond ::Hard Drive Check Sum : MD5 :: "},
    .sha1 = {"cat /tmp/fdisk_tmp | grep ^Disk |sha1sum |awk '{print $1}'",
             "cond ::Hard Drive Check Sum : SHA1 :: "},
};
constexpr Extract kPartitions = {
    .different = "Partition Check Sum found Different",
    .md5 = {"cat /tmp/fdisk_tmp | grep ^/dev |md5sum |awk '{print $1}'",
            "cond ::Partition Check Sum : MD5 :: "},
    .sha1 = {"cat /tmp/fdisk_tmp | grep ^/dev |sha1sum |awk '{print $1}'",
             "cond ::Partition Check Sum : SHA1 :: "},
};

/// The digest, or "" when its command fails: an empty value differs from any earlier one, so that the nodes
/// are built anew rather than kept on no evidence.
std::string take(const Digest& digest) {
    std::string value;
    if (isDiskSnapshotOurs()) {
        HostCommand answer = startUnderFileLock(digest.command);
        if (!answer.started()) {
            return {};
        }
        value = trimEnd(answer.nextLine().value_or(""));
    }
    log(kProgress) << digest.logged << value;
    return value;
}

void takeFingerprints(const Extract& extract, FingerprintPair& pair, bool keepCurrent) {
    pair.md5.current = take(extract.md5);
    pair.sha1.current = take(extract.sha1);
    if (!keepCurrent) {
        pair.accept();
    }
}

/// What a command ended by force printed is not the layout: nodes may be missing, so the next pass builds
/// them again.
template <class Rebuild>
void rebuildIfDifferent(const Extract& extract, FingerprintPair& pair, Rebuild rebuild) {
    // An aborted thread could only withdraw the nodes, for it can list nothing; one that was left has no
    // nodes.
    if (QX::Thread::isAborted() || QX::Thread::isLeft() || !pair.differs()) {
        return;
    }
    const unsigned int before = commandsCutOff();
    rebuild();
    if (commandsCutOff() != before || QX::Thread::isLeft()) {
        return;
    }
    pair.accept();
    log(kProgress) << extract.different;
}

}  // namespace

void StorageBuilder::HardDrive_Checksum(bool keepCurrent) {
    const LogScope scope("Hard Drive Check Sum : Entry", "Hard Drive Check Sum : Exit");
    takeFingerprints(kDrives, driveFingerprints_, keepCurrent);
}

void StorageBuilder::Partition_Checksum(bool keepCurrent) {
    const LogScope scope("Partition Check Sum : Entry", "Partition Check Sum : Exit");
    takeFingerprints(kPartitions, partitionFingerprints_, keepCurrent);
}

// The references start empty, so that the first pass always rebuilds both kinds: agents rely on seeing every
// drive and partition published once after start.
void StorageBuilder::HDDThreadProcess() {
    const LogScope scope("Hard Drive ThreadProcess :: Entry", "Hard Drive ThreadProcess :: Exit");
    if (!takeDiskSnapshot()) {
        return;  // an old one, half of one or none: none is the layout of now
    }
    HardDrive_Checksum(true);
    Partition_Checksum(true);
    rebuildIfDifferent(kDrives, driveFingerprints_, [this] { createHardDriveNodes(true); });
    rebuildIfDifferent(kPartitions, partitionFingerprints_, [this] { createPartitionNodes(true); });
}

void StorageBuilder::forgetStorageNodes() {
    driveNodes_.clear();
    partitionNodes_.clear();
}

}  // namespace IC
