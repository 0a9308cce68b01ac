#pragma once

#include <string>
#include <vector>

#include "agent/core/catalogue.h"

/// What a person's words for properties and values mean, before anything is asked of the host.
namespace cvagent {

/// The properties behind names and numbers; a number need not be in the catalogue. All of the node's when
/// there are no words. Throws Problem (notFound).
std::vector<unsigned int> readableIds(const IC::MutableNode& node, const std::vector<std::string>& words);

/// The property that a write is about. Throws Problem: notFound, refused.
const Property& writableRow(const IC::MutableNode& node, const std::string& word);
/// The value that a write sets. Throws Problem (refused) when the property does not accept it.
IC::PropertyValue acceptedValue(const Property& row, const std::vector<std::string>& words);

/// The label of a value whose writing stops the host; null for any other. Front ends ask twice.
const Label* drasticLabel(const Property& row, const IC::PropertyValue& value);

}  // namespace cvagent
