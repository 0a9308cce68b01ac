#include "agent/core/catalogue.h"

#include <strings.h>
#include <algorithm>
#include <array>
#include <atomic>
#include <mutex>
#include <stdexcept>

#include "agent/core/oshw/tables.h"
#include "agent/core/value_check.h"
#include "framework/qx/whole_number.h"
#include "framework/qx/zone_table.h"

namespace cvagent {

namespace {

/// It only grows, so that whoever reads needs no lock.
class Tables {
public:
    using All = std::span<const CatalogueTable* const>;

    Tables() { add(oshw::table()); }
    /// @return whether there was room
    bool add(const CatalogueTable& table) {
        const std::size_t count = count_.load();
        if (count == tables_.size()) {
            return false;
        }
        tables_.at(count) = &table;
        count_.store(count + 1);
        return true;
    }
    All all() const { return All(tables_).first(count_.load()); }

private:
    std::array<const CatalogueTable*, 64> tables_{};  // those that are not counted belong to who adds
    std::atomic<std::size_t> count_{0};
};

Tables& allTables() {
    static Tables all;
    return all;
}

Tables::All tables() {
    return allTables().all();
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
constexpr std::array kKindNames = {"number", "enum", "text", "texts", "numbers", "flag"};
constexpr std::array kUnitNames = {"",    "bytes", "kB",           "KiB", "kbit/s", "Mbit/s",
                                   "kHz", "MHz",   "s since 1970", "min", "bits",   ""};

/// Calls something for the rows of a class until it says that it has seen enough.
template <class Enough>
void forEachOf(unsigned int nodeType, const Enough& enough) {
    for (const CatalogueTable* table : tables()) {
        for (const auto part : table->properties) {
            for (const Property& row : part) {
                if (static_cast<unsigned int>(row.type) == nodeType && enough(row)) {
                    return;
                }
            }
        }
    }
}

template <class Predicate>
const Property* firstOf(unsigned int nodeType, const Predicate& isMeant) {
    const Property* found = nullptr;
    forEachOf(nodeType, [&](const Property& row) {
        found = isMeant(row) ? &row : nullptr;
        return found != nullptr;
    });
    return found;
}

}  // namespace

void addToCatalogue(const CatalogueTable& table) {
    static std::mutex guard;
    const std::lock_guard lock(guard);
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
    if (!allTables().add(table)) {
        throw std::logic_error("there is no room for the catalogue of " + std::string(table.owner));
    }
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

const Effect* findEffect(const Property& property) {
    return findRow(&CatalogueTable::effects, [&property](const Effect& row) {
        return row.type == property.type && row.id == property.id;
    });
}

std::vector<const Property*> propertiesOf(unsigned int nodeType) {
    std::vector<const Property*> rows;
    forEachOf(nodeType, [&rows](const Property& row) {
        rows.push_back(&row);
        return false;
    });
    return rows;
}

const Property* findProperty(unsigned int nodeType, unsigned int id) {
    return firstOf(nodeType, [id](const Property& row) { return row.id == id; });
}

const Property* findProperty(unsigned int nodeType, const std::string& text) {
    if (const auto id = QX::wholeNumber<unsigned int>(text)) {
        return findProperty(nodeType, *id);
    }
    return firstOf(nodeType,
                   [&text](const Property& row) { return strcasecmp(row.name, text.c_str()) == 0; });
}

const char* kindName(Kind kind) {
    return kKindNames.at(static_cast<std::size_t>(kind));
}

const char* unitName(const Property& property) {
    return property.unitText != nullptr ? property.unitText
                                        : kUnitNames.at(static_cast<std::size_t>(property.unit));
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
