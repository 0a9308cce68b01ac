#pragma once

#include <optional>
#include <string>

namespace hardware {

/// What only a link's driver tells.
struct LinkDriver {
    std::optional<std::string> name;
    std::optional<std::string> firmware;
    std::optional<std::string> bus;
    std::optional<std::string> permanentAddress;
};

/// Asks the driver (ETHTOOL_GDRVINFO, ETHTOOL_GPERMADDR); what it does not tell stays empty.
LinkDriver askDriver(const std::string& link);

}  // namespace hardware
