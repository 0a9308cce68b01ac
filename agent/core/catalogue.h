#pragma once

#include <optional>
#include <span>
#include <string>
#include <vector>

#include "agent/core/node_classes.h"
#include "framework/ic/property_value.h"

namespace cvagent {

enum class Kind { number, enumeration, text, texts, numbers };

/// What a number counts; decides how it is shown to people.
enum class Unit {
    none,
    thousandBytes,
    kibibytes,
    kilobitsPerSecond,
    megabitsPerSecond,
    megahertz,
    secondsSinceEpoch,
    minutes,
    bits,
};

/// A code of an enumeration and what it means.
struct Label {
    const char* text;
    unsigned int code;
    bool writable = false;  ///< the code may be written
    bool drastic = false;   ///< writing it stops the host: front ends ask twice
};

struct Property;

/// Makes the value for the plug-in out of the words that a person gave; nothing when the property does not
/// accept them.
using Check = std::optional<IC::PropertyValue> (*)(const Property& property,
                                                   std::span<const std::string> words);

/// One row of the catalogue: a property of a class of nodes.
struct Property {
    NodeType type;
    unsigned int id;
    const char* name;
    Kind kind;
    Unit unit;
    std::span<const Label> labels;  ///< empty when the codes have no meaning of their own
    const char* meaning;
    Check check = nullptr;          ///< set for what can be written
    const char* accepts = nullptr;  ///< what check lets pass, in words; null: told from the labels
    bool readable = true;

    bool writable() const { return check != nullptr; }
};

// The rows stay where they are until the program ends.

/// The rows of one class, ids ascending.
std::vector<const Property*> propertiesOf(unsigned int nodeType);
/// The row with that id; null when the class has none.
const Property* findProperty(unsigned int nodeType, unsigned int id);
/// The row a person means by a number or a name, upper or lower case; null for none.
const Property* findProperty(unsigned int nodeType, const std::string& text);

const char* kindName(Kind kind);
/// "" for Unit::none.
const char* unitName(Unit unit);
/// The label of a code; null when it has none.
const Label* findLabel(const Property& property, unsigned int code);
/// What the property accepts, for a message.
std::string acceptedText(const Property& property);

/// What an alert's text says of a property of its node.
struct AlertRow {
    const char* message;  ///< without blanks at its end
    unsigned int property;
    unsigned int after;
};
/// Null for an alert that says nothing of the kind.
const AlertRow* findAlert(const std::string& message);

/// What one plug-in brings to the catalogue; it stands in a folder of its own.
struct CatalogueTable {
    const char* owner;
    std::span<const NodeClass> classes;
    std::vector<std::span<const Property>> properties;
    std::span<const AlertRow> alerts;
};
/// Adds a plug-in's table to the catalogue. To be called before the first agent is made; the table is used
/// until the program ends. Throws std::logic_error when another table has such a class or property already.
void addToCatalogue(const CatalogueTable& table);

}  // namespace cvagent
