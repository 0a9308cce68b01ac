#pragma once

#include <optional>
#include <string>
#include <vector>

#include "plugins/hardware/host.h"

namespace hardware {

/// A chip with sensors.
struct Chip {
    std::string name;       ///< "coretemp-isa-0000": the chip and where it sits, the same after a restart
    std::string sort;       ///< "coretemp"
    std::string directory;  ///< where its files are
};

/// The chips in the order of the kernel; one without a name is left out.
std::vector<Chip> chips(const Host& host);
/// The chip with that name.
std::optional<Chip> findChip(const Host& host, const std::string& name);

}  // namespace hardware
