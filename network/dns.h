#pragma once

#include <string>
#include <vector>

#include "framework/ic/property_value.h"

namespace IC {

// The resolver's settings. They are the host's: every IP configuration shows and changes the same.

/// Makes `values` the name servers, or the search suffixes, of /etc/resolv.conf, in this order. Existing
/// lines are overwritten where they stand, what is over is appended or dropped. A file that cannot be read or
/// written is logged and stays as it is.
/// @param servers true for the name servers, false for the suffixes
void executeDNSChanges(std::vector<std::string> values, bool servers);

/// Tells netconfig whether /etc/resolv.conf is its own: it is with DHCP, and no longer with a fixed address,
/// so that name servers set by hand survive. A host without the policy key is left alone.
/// @param origin an IPOrigin code; any other than dhcp and fixed changes nothing
void disableNetConfigDNSPolicy(PropertyValue origin);

/// Reads /etc/resolv.conf. Lines with a '#' anywhere are passed over.
/// @param servers, suffixes are appended to; untouched when the file cannot be opened
void getDNSDetails(std::vector<std::string>& servers, std::vector<std::string>& suffixes);

}  // namespace IC
