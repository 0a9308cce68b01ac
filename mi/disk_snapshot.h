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

/// Writes the snapshot, in a file of its own. Leaving waits for fdisk.
/// @return whether it is whole, that is, ends with a line break, or is empty on a disk with room. False also
/// when its file could not be made, fdisk could not be started or was ended by force
bool takeDiskSnapshot();

/// Whether the snapshot may be read. When it may not, a command that would read it is not run and counts as
/// one that printed nothing.
bool isDiskSnapshotOurs();

/// Removes the snapshot; one that is not there is no failure.
void deleteFdiskTmp();

}  // namespace IC
