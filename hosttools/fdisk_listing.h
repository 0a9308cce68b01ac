#pragma once

#include "hosttools/disks.h"
#include "hosttools/text.h"

namespace hosttools {

/// One disk in the classic format: a blank line, the "Disk" line with the size in bytes as its fifth word,
/// geometry and units, and one line a partition. A disk without a partition table ends after its identifier.
void listDisk(Text& text, const Disk& disk);
/// @return whether a disk has neither a partition table nor partitions
bool isBare(const Disk& disk);
/// What the classic tool says on standard error of a disk without a partition table, with the newline.
Text missingTableMessage(const Disk& disk);

}  // namespace hosttools
