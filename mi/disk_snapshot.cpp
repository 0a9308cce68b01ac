#include "mi/disk_snapshot.h"

#include <sys/statvfs.h>
#include <unistd.h>

#include "mi/globals.h"
#include "mi/log.h"

namespace IC {

namespace {

class FileLock {
public:
    FileLock() { OSHWMI::myfileLock.lock(static_cast<unsigned long>(-1)); }
    FileLock(const FileLock&) = delete;
    FileLock& operator=(const FileLock&) = delete;
    ~FileLock() { OSHWMI::myfileLock.unlock(); }
};

/// Whether the snapshot's disk has room left. When it has none, the snapshot may end anywhere.
bool foundRoom() {
    struct statvfs disk {};
    if (statvfs(diskSnapshotPath, &disk) != 0 || disk.f_blocks == 0) {
        return true;  // not for us to tell
    }
    return (geteuid() == 0 ? disk.f_bfree : disk.f_bavail) > 0;
}

}  // namespace

HostCommand startUnderFileLock(const Command& command) {
    const FileLock lock;
    return HostCommand(command);
}

bool takeDiskSnapshot() {
    const unsigned int before = commandsCutOff();
    const bool started = startUnderFileLock(diskSnapshotCommand).started();
    return started && commandsCutOff() == before && foundRoom();
}

void deleteFdiskTmp() {
    const LogScope scope;
    log(kProgress) << "Deleting " << diskSnapshotPath;
    if (!startUnderFileLock(formatCommand("rm %s 2> /dev/null", diskSnapshotPath)).started()) {
        log(kError) << "Could not delete " << diskSnapshotPath;
    }
}

}  // namespace IC
