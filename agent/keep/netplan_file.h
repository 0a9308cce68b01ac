#pragma once

#include <string>

#include "agent/keep/wish.h"

namespace cvagent::keep {

/// Whether a file of netplan's defines an interface. Throws CannotKeep for a file that is not understood.
/// @param id under which it stands there, which need not be the link's name
bool definesInNetplan(const std::string& text, const std::string& id);

/// Such a file with as little changed as the wish takes: values are replaced where they stand, what is
/// missing is added to the interface; with DHCP its addresses and default route of IPv4 go. Understood is a
/// part of YAML: mappings by indentation, lists by lines or in brackets on one line, plain and quoted values;
/// no tabs, anchors, tags, merges, braces around what is to be changed, nor anything in brackets that goes on
/// in another line. Throws CannotKeep.
std::string editedNetplan(const std::string& text, const std::string& id, const Wish& wish);

}  // namespace cvagent::keep
