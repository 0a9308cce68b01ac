#pragma once

#include <string>

#include "agent/service/model.h"

namespace cvagent::service {

/// What the object says of itself to org.freedesktop.DBus.Introspectable.
/// @param node null for the agent's own object, or for one that is only on the way to others
std::string introspect(const Model& model, const std::string& object, const NodeView* node);

/// Whether there are objects below it, or it is the agent's own.
bool leadsSomewhere(const Model& model, const std::string& object);

}  // namespace cvagent::service
