#include "mi/disk_snapshot.h"

#include <fcntl.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include "mi/globals.h"
#include "mi/log.h"
#include "mi/temporary_file.h"

namespace IC {

namespace {

class FileLock {
public:
    FileLock() { OSHWMI::myfileLock.lock(static_cast<unsigned long>(-1)); }
    FileLock(const FileLock&) = delete;
    FileLock& operator=(const FileLock&) = delete;
    ~FileLock() { OSHWMI::myfileLock.unlock(); }
};

constinit TemporaryFile snapshot(diskSnapshotPath);

/// Whether a disk has room left; one that does not count its blocks has.
bool hasRoom(int file) {
    struct statvfs disk {};
    return fstatvfs(file, &disk) == 0 &&
           (disk.f_blocks == 0 || (geteuid() == 0 ? disk.f_bfree : disk.f_bavail) > 0);
}

/// Whether a text ends where a line does. One that is empty may have found no room.
bool endsWhole(int file) {
    if (lseek(file, -1, SEEK_END) < 0) {
        return hasRoom(file);
    }
    char last = '\0';
    return read(file, &last, 1) == 1 && last == '\n';
}

bool isWhole() {
    const int file = snapshot.isOurs() ? open(diskSnapshotPath, O_RDONLY | O_NOFOLLOW | O_CLOEXEC) : -1;
    const bool whole = file >= 0 && endsWhole(file);
    if (file >= 0) {
        close(file);
    }
    return whole;
}

}  // namespace

HostCommand startUnderFileLock(const Command& command) {
    const FileLock lock;
    return HostCommand(command);
}

bool takeDiskSnapshot() {
    const unsigned int before = commandsCutOff();
    std::optional<HostCommand> fdisk;
    {
        const FileLock lock;
        if (snapshot.removeAndCreate()) {
            fdisk.emplace(Command(diskSnapshotCommand));
        }
    }
    const bool started = fdisk && fdisk->started();
    fdisk.reset();  // which waits for it
    return started && commandsCutOff() == before && isWhole();
}

bool isDiskSnapshotOurs() {
    return snapshot.isOurs();
}

void deleteFdiskTmp() {
    const LogScope scope;
    log(kProgress) << "Deleting " << diskSnapshotPath;
    if (!startUnderFileLock(formatCommand("rm %s 2> /dev/null", diskSnapshotPath)).started()) {
        log(kError) << "Could not delete " << diskSnapshotPath;
    }
}

}  // namespace IC
