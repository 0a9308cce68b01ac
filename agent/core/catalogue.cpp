#include "agent/core/catalogue.h"

#include <strings.h>
#include <algorithm>
#include <charconv>
#include <stdexcept>

#include "agent/core/oshw/tables.h"
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
    for (const CatalogueTable* table : tables()) {
        for (const NodeClass& row : table->classes) {
            if (static_cast<unsigned int>(row.type) == nodeType) {
                return &row;
            }
        }
    }
    return nullptr;
}

const NodeClass* findClass(const std::string& name) {
    for (const CatalogueTable* table : tables()) {
        for (const NodeClass& row : table->classes) {
            if (row.name == name) {
                return &row;
            }
        }
    }
    return nullptr;
}

const AlertRow* findAlert(const std::string& message) {
    const std::string text = message.substr(0, message.find_last_not_of(' ') + 1);
    for (const CatalogueTable* table : tables()) {
        for (const AlertRow& row : table->alerts) {
            if (row.message == text) {
                return &row;
            }
        }
    }
    return nullptr;
}

std::vector<Property> propertiesOf(unsigned int nodeType) {
    std::vector<Property> rows;
    for (const CatalogueTable* table : tables()) {
        for (const auto part : table->properties) {
            std::copy_if(part.begin(), part.end(), std::back_inserter(rows), [nodeType](const Property& row) {
                return static_cast<unsigned int>(row.type) == nodeType;
            });
        }
    }
    return rows;
}

std::optional<Property> findProperty(unsigned int nodeType, unsigned int id) {
    for (const Property& row : propertiesOf(nodeType)) {
        if (row.id == id) {
            return row;
        }
    }
    return std::nullopt;
}

std::optional<Property> findProperty(unsigned int nodeType, const std::string& text) {
    unsigned int id = 0;
    const char* end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, id);
    if (error == std::errc() && stop == end) {
        return findProperty(nodeType, id);
    }
    for (const Property& row : propertiesOf(nodeType)) {
        if (strcasecmp(row.name, text.c_str()) == 0) {
            return row;
        }
    }
    return std::nullopt;
}

const char* kindName(Kind kind) {
    switch (kind) {
        case Kind::number:
            return "number";
        case Kind::enumeration:
            return "enum";
        case Kind::text:
            return "text";
        case Kind::texts:
            return "texts";
        case Kind::numbers:
            return "numbers";
    }
    return "none";
}

const char* unitName(Unit unit) {
    switch (unit) {
        case Unit::none:
            return "";
        case Unit::thousandBytes:
            return "kB";
        case Unit::kibibytes:
            return "KiB";
        case Unit::kilobitsPerSecond:
            return "kbit/s";
        case Unit::megabitsPerSecond:
            return "Mbit/s";
        case Unit::megahertz:
            return "MHz";
        case Unit::secondsSinceEpoch:
            return "s since 1970";
        case Unit::minutes:
            return "min";
        case Unit::bits:
            return "bits";
    }
    return "";
}

const char* labelOf(const Property& property, unsigned int code) {
    const auto found = std::find_if(property.labels.begin(), property.labels.end(),
                                    [code](const Label& label) { return label.code == code; });
    return found == property.labels.end() ? nullptr : found->text;
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
