#pragma once

#include <string>
#include <vector>

#include "agent/bus/writer.h"
#include "agent/service/model.h"

/// The properties of a node's object.
namespace cvagent::service {

/// The value of a property of com.vantrel.Corvista1.Node, as a variant.
/// @param name of one that there is
void putNodeProperty(bus::Writer& writer, const Model& model, const NodeView& node, const std::string& name);
bool hasNodeProperty(const std::string& name);
/// All of them, as a{sv}.
void putNodeProperties(bus::Writer& writer, const Model& model, const NodeView& node);
/// The reading behind a property of the class's interface; null when the node shows none of that name.
const Reading* findByName(const NodeView& node, const std::string& name);
/// What is known of the class's properties, as a{sv}.
void putClassProperties(bus::Writer& writer, const NodeView& node, bool withTrusted);
/// Both interfaces with their properties, as a{sa{sv}}.
void putInterfaces(bus::Writer& writer, const Model& model, const NodeView& node, bool withTrusted);
/// "(uuuuosssu)" of the node, without the brackets: what a structure holds.
void putNodeHead(bus::Writer& writer, const NodeView& node);

}  // namespace cvagent::service
