#include "mi/disk_snapshot.h"

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

}  // namespace

HostCommand startUnderFileLock(const std::optional<std::string>& command) {
    const FileLock lock;
    return HostCommand(command);
}

bool takeDiskSnapshot() {
    return startUnderFileLock(diskSnapshotCommand).started();
}

void deleteFdiskTmp() {
    const LogScope scope;
    log(kProgress) << "Deleting " << diskSnapshotPath;
    if (!startUnderFileLock(formatCommand("rm %s 2> /dev/null", diskSnapshotPath)).started()) {
        log(kError) << "Could not delete " << diskSnapshotPath;
    }
}

}  // namespace IC
