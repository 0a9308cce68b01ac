#include "agent/core/catalogue.h"

#include <strings.h>
#include <algorithm>
#include <array>
#include <stdexcept>

#include "agent/core/oshw/tables.h"
#include "agent/core/text.h"
#include "agent/core/value_check.h"
#include "framework/qx/zone_table.h"

namespace cvagent {

namespace {

using Tables = std::vector<const CatalogueTable*>;

Tables& tables() {
    static Tables all{&oshw::table()};
    return all;
}

[[noreturn]] void refuse(const CatalogueTable& table, const std::string& what) {
    throw std::logic_error("the catalogue of " + std::string(table.owner) + " has " + what +
                           ", which is there already");
}

/// The first row of any table of which something is true; null for none.
template <class Row, class Predicate>
const Row* findRow(std::span<const Row> CatalogueTable::*rows, const Predicate& isMeant) {
    for (const CatalogueTable* table : tables()) {
        const auto found = std::ranges::find_if(table->*rows, isMeant);
        if (found != (table->*rows).end()) {
            return &*found;
        }
    }
    return nullptr;
}

// In the order of the enumerations.
constexpr std::array kKindNames = {"number", "enum", "text", "texts", "numbers"};
constexpr std::array kUnitNames = {"", "kB", "KiB", "kbit/s", "Mbit/s", "MHz", "s since 1970", "min", "bits"};

}  // namespace

void addToCatalogue(const CatalogueTable& table) {
    for (const NodeClass& row : table.classes) {
        if (findClass(static_cast<unsigned int>(row.type)) != nullptr || findClass(row.name) != nullptr) {
            refuse(table, std::string("the class ") + row.name);
        }
    }
    for (const auto part : table.properties) {
        for (const Property& row : part) {
            if (findProperty(static_cast<unsigned int>(row.type), row.id)) {
                refuse(table, std::string("the property ") + row.name);
            }
        }
    }
    tables().push_back(&table);
}

std::vector<NodeClass> nodeClasses() {
    std::vector<NodeClass> all;
    for (const CatalogueTable* table : tables()) {
        all.insert(all.end(), table->classes.begin(), table->classes.end());
    }
    return all;
}

const NodeClass* findClass(unsigned int nodeType) {
    return findRow(&CatalogueTable::classes, [nodeType](const NodeClass& row) {
        return static_cast<unsigned int>(row.type) == nodeType;
    });
}

const NodeClass* findClass(const std::string& name) {
    return findRow(&CatalogueTable::classes, [&name](const NodeClass& row) { return row.name == name; });
}

const AlertRow* findAlert(const std::string& message) {
    const std::string text = message.substr(0, message.find_last_not_of(' ') + 1);
    return findRow(&CatalogueTable::alerts, [&text](const AlertRow& row) { return row.message == text; });
}

std::vector<const Property*> propertiesOf(unsigned int nodeType) {
    std::vector<const Property*> rows;
    for (const CatalogueTable* table : tables()) {
        for (const auto part : table->properties) {
            for (const Property& row : part) {
                if (static_cast<unsigned int>(row.type) == nodeType) {
                    rows.push_back(&row);
                }
            }
        }
    }
    return rows;
}

const Property* findProperty(unsigned int nodeType, unsigned int id) {
    const auto rows = propertiesOf(nodeType);
    const auto found = std::ranges::find(rows, id, &Property::id);
    return found == rows.end() ? nullptr : *found;
}

const Property* findProperty(unsigned int nodeType, const std::string& text) {
    if (const auto id = wholeNumber<unsigned int>(text)) {
        return findProperty(nodeType, *id);
    }
    const auto rows = propertiesOf(nodeType);
    const auto found = std::ranges::find_if(
        rows, [&text](const Property* row) { return strcasecmp(row->name, text.c_str()) == 0; });
    return found == rows.end() ? nullptr : *found;
}

const char* kindName(Kind kind) {
    return kKindNames.at(static_cast<std::size_t>(kind));
}

const char* unitName(Unit unit) {
    return kUnitNames.at(static_cast<std::size_t>(unit));
}

const Label* findLabel(const Property& property, unsigned int code) {
    const auto found = std::ranges::find(property.labels, code, &Label::code);
    return found == property.labels.end() ? nullptr : &*found;
}

std::string acceptedText(const Property& property) {
    std::string text = property.accepts != nullptr ? property.accepts : "";
    const auto add = [&text](const std::string& item) {
        text += (text.empty() || text.ends_with(' ') ? "" : ", ") + item;
    };
    if (property.check == check::timeZoneOffset) {
        for (const QX::Zone& zone : QX::zoneTable) {
            add(std::to_string(zone.offset));
        }
    }
    for (const Label& label : property.labels) {
        if (label.writable && property.accepts == nullptr) {
            add(std::to_string(label.code) + " (" + label.text + ")");
        }
    }
    return text;
}

}  // namespace cvagent
