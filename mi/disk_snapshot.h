#pragma once

#include <string>

#include "mi/command.h"

namespace IC {

/// The text of all partition tables as fdisk prints them, from which drives and partitions are built.
inline constexpr char diskSnapshotPath[] = "/tmp/fdisk_tmp";
inline constexpr char diskSnapshotCommand[] = "fdisk -ls 2>/dev/null > /tmp/fdisk_tmp";

/// Starts a command that touches the disk snapshot while it holds the file lock. The output is read after the
/// lock has been released.
HostCommand startUnderFileLock(const Command& command);

/// Makes the snapshot's file anew, has fdisk fill it and waits for that.
/// @return whether the snapshot is complete: it ends with a line break, or is empty though the disk has room.
///         False also when its file could not be made, and when fdisk could not be started or was cut off
bool takeDiskSnapshot();

/// Whether the snapshot may be read (TemporaryFile::isOurs). If not, the commands that read it are not run;
/// they count as having printed nothing.
bool isDiskSnapshotOurs();

/// Removes the snapshot; one that is not there is no failure.
void deleteFdiskTmp();

}  // namespace IC
