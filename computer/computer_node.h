#pragma once

#include "mi/host_node.h"

namespace IC {

extern const NodeClass computerClass;

/// The computer system as a whole: names, owner, clock, power.
class ComputerNode : public NodeOf<computerClass> {
public:
    using NodeOf::NodeOf;

    /// Asks the host: its name (gethostname), the owner's data (asset file), the clock in seconds since
    /// 1970-01-01 UTC, the offset from UTC in force in minutes (east positive). Every other id gives what was
    /// stored last.
    /// @return status 1 when the host did not answer; `out` is then empty
    Error getProperty(unsigned int id, PropertyValue& out) const override;
    /// Changes the host once start-up is over; until then every value is only stored. The owner's data are
    /// stored as well, the clock (an ISO 8601 text) and the zone (one of the offsets of the zone table) are
    /// not: they are read from the host. A power action is run without waiting for its success.
    /// @return status 1 when the change was not made or the value is none that the property can have
    Error setProperty(const unsigned int& id, const PropertyValue& value) override;
};

}  // namespace IC
