#pragma once

#include <string>
#include <vector>

#include "agent/core/catalogue.h"

/// What the words of a question mean to a node, before anything is asked of the host.
namespace cvagent {

/// The properties behind names and numbers; a number need not be in the catalogue. All of the node's when
/// there are no words. Throws Problem (notFound).
std::vector<unsigned int> readableIds(const IC::MutableNode& node, const std::vector<std::string>& words);

/// The property that a write is about. Throws Problem: notFound, refused.
Property writableRow(const IC::MutableNode& node, const std::string& word);
/// The value that a write sets. Throws Problem (refused) when the property does not accept it.
IC::PropertyValue acceptedValue(const Property& row, const std::vector<std::string>& words);

/// What a write does to the host itself; front ends ask twice.
enum class PowerAction { none, restart, halt };
PowerAction powerAction(const Property& row, const IC::PropertyValue& value);

}  // namespace cvagent
