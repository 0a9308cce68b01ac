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

/// Writes the snapshot. It is whole when this returns: leaving waits for fdisk.
/// @return false when fdisk could not be started, a signal ended it, or its disk is full: it is not whole
/// then
bool takeDiskSnapshot();

/// Removes the snapshot; one that is not there is no failure.
void deleteFdiskTmp();

}  // namespace IC
