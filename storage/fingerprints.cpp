// The fingerprints of the disk snapshot, and what a pass of the drive monitor does with them.
#include "mi/disk_snapshot.h"
#include "mi/log.h"
#include "mi/os_hw_mi.h"
#include "mi/text.h"

namespace IC {

namespace {

/// The lines of the snapshot that describe one kind of node, and the commands that digest them.
struct Extract {
    const char* title;  ///< in the log
    const char* md5Command;
    const char* sha1Command;
};

constexpr Extract kDrives = {
    "Hard Drive Check Sum",
    "cat /tmp/fdisk_tmp | grep ^Disk |md5sum |awk '{print $1}'",
    "cat /tmp/fdisk_tmp | grep ^Disk |sha1sum |awk '{print $1}'",
};
constexpr Extract kPartitions = {
    "Partition Check Sum",
    "cat /tmp/fdisk_tmp | grep ^/dev |md5sum |awk '{print $1}'",
    "cat /tmp/fdisk_tmp | grep ^/dev |sha1sum |awk '{print $1}'",
};

/// The digest, or "" when its command fails: an empty value differs from any earlier one, so that the nodes
/// are built anew rather than kept on no evidence.
std::string digest(const char* command, const char* title, const char* kind) {
    HostCommand answer = startUnderFileLock(command);
    if (!answer.started()) {
        return {};
    }
    std::string value = trimEnd(answer.nextLine().value_or(""));
    log(kProgress) << "cond ::" << title << " : " << kind << " :: " << value;
    return value;
}

void takeFingerprints(const Extract& extract, FingerprintPair& pair, bool keepCurrent) {
    log(kProgress) << extract.title << " : Entry";
    pair.md5.current.clear();
    pair.sha1.current.clear();
    pair.md5.current = digest(extract.md5Command, extract.title, "MD5");
    pair.sha1.current = digest(extract.sha1Command, extract.title, "SHA1");
    if (!keepCurrent) {
        pair.accept();
    }
    log(kProgress) << extract.title << " : Exit";
}

template <class Rebuild>
void rebuildIfDifferent(FingerprintPair& pair, const char* different, Rebuild rebuild) {
    if (!pair.differs()) {
        return;
    }
    rebuild();
    pair.accept();
    log(kProgress) << different;
}

}  // namespace

void OsHwMI::HardDrive_Checksum(bool keepCurrent) {
    takeFingerprints(kDrives, driveFingerprints_, keepCurrent);
}

void OsHwMI::Partition_Checksum(bool keepCurrent) {
    takeFingerprints(kPartitions, partitionFingerprints_, keepCurrent);
}

// The references start empty, so that the first pass always rebuilds both kinds: agents rely on seeing every
// drive and partition published once after start.
void OsHwMI::HDDThreadProcess() {
    log(kProgress) << "Hard Drive ThreadProcess :: Entry";
    if (takeDiskSnapshot()) {
        HardDrive_Checksum(true);
        Partition_Checksum(true);
        rebuildIfDifferent(driveFingerprints_, "Hard Drive Check Sum found Different",
                           [this] { createHardDriveNodes(true); });
        rebuildIfDifferent(partitionFingerprints_, "Partition Check Sum found Different",
                           [this] { createPartitionNodes(true); });
    }
    log(kProgress) << "Hard Drive ThreadProcess :: Exit";
}

}  // namespace IC
