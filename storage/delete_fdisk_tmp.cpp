#include "mi/disk_snapshot.h"
#include "mi/log.h"
#include "mi/shut_down.h"

namespace IC {

void deleteFdiskTmp() {
    const LogScope scope("deleteFdiskTmp");
    log(kProgress) << "Deleting " << diskSnapshotPath;
    const HostCommand removal = startUnderFileLock(formatCommand("rm %s 2> /dev/null", diskSnapshotPath));
    if (!removal.started()) {
        log(kError) << "Could not delete " << diskSnapshotPath;
    }
}

}  // namespace IC
