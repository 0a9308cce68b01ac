// A plug-in's own catalogue as its file has it. Each row stands for itself: one that cannot be used costs
// only itself.
#include <algorithm>
#include <array>
#include <deque>
#include <memory>
#include <mutex>
#include <optional>
#include <set>

#include "agent/core/catalogue_file.h"
#include "agent/core/catalogue_rows.h"
#include "agent/core/text.h"

namespace cvagent {

namespace {

constexpr std::size_t kLongestName = 40;
constexpr std::size_t kLongestText = 500;
constexpr std::size_t kMostComplaints = 10;

struct NamedUnit {
    std::string_view name;
    Unit unit;
    const char* shown;  ///< null: as the unit has it
};

constexpr auto kNamedUnits = std::to_array<NamedUnit>({
    {"bytes", Unit::bytes, nullptr},
    {"kilobits per second", Unit::kilobitsPerSecond, nullptr},
    {"megabits per second", Unit::megabitsPerSecond, nullptr},
    {"kilohertz", Unit::kilohertz, nullptr},
    {"megahertz", Unit::megahertz, nullptr},
    {"seconds since 1970", Unit::secondsSinceEpoch, nullptr},
    {"degrees Celsius", Unit::other, "°C"},
    {"revolutions per minute", Unit::other, "RPM"},
    {"megatransfers per second", Unit::other, "MT/s"},
    {"volts", Unit::other, "V"},
    {"amperes", Unit::other, "A"},
    {"watts", Unit::other, "W"},
    {"joules", Unit::other, "J"},
    {"percent", Unit::other, "%"},
    {"hours", Unit::other, "h"},
    {"seconds", Unit::other, "s"},
    {"milliseconds", Unit::other, "ms"},
    {"as the value", Unit::none, "as the value"},  // of a limit: what it limits says it
});

/// A table with all that its rows point to.
struct OwnTable {
    std::deque<std::string> texts;
    std::deque<std::vector<unsigned int>> telling;
    std::vector<NodeClass> classes;
    std::vector<Property> properties;
    CatalogueTable table{};
};

bool isDigitOrLetter(char c) {
    return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z');
}

/// "drive-part": it becomes a part of paths and a word of the command line.
bool isClassName(const std::string& name) {
    return !name.empty() && name.size() <= kLongestName && name.front() >= 'a' && name.front() <= 'z' &&
           !name.starts_with("type-") && std::ranges::all_of(name, [](char c) {
               return c == '-' || (isDigitOrLetter(c) && (c < 'A' || c > 'Z'));
           });
}

/// "SerialNumber"
bool isPropertyName(const std::string& name) {
    return !name.empty() && name.size() <= kLongestName && name.front() >= 'A' && name.front() <= 'Z' &&
           std::ranges::all_of(name, isDigitOrLetter);
}

std::string lowered(std::string name) {
    std::ranges::transform(name, name.begin(), [](char c) {
        return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
    });
    return name;
}

std::optional<Kind> kindNamed(const std::string& name) {
    for (const Kind kind :
         {Kind::number, Kind::enumeration, Kind::text, Kind::texts, Kind::numbers, Kind::flag}) {
        if (name == kindName(kind)) {
            return kind;
        }
    }
    return std::nullopt;
}

class CatalogueParser {
public:
    explicit CatalogueParser(const std::string& owner) { own_->table.owner = keep(owner); }

    ParsedCatalogue parse(std::string_view text) {
        const auto lists = readCatalogueRows(text);
        if (!lists) {
            return {nullptr, {"it is no JSON object"}};
        }
        each(lists->classes, "classes", [this](const CatalogueRow& row) { addClass(row); });
        each(lists->properties, "properties", [this](const CatalogueRow& row) { addProperty(row); });
        std::ranges::sort(own_->properties, {},
                          [](const Property& row) { return std::pair(row.type, row.id); });
        return {kept(), std::move(complaints_)};
    }

private:
    void complain(const std::string& text) {
        if (complaints_.size() < kMostComplaints) {
            complaints_.push_back(text);
        } else if (complaints_.size() == kMostComplaints) {
            complaints_.emplace_back("and more");
        }
    }

    const char* keep(const std::string& text) {
        return text.empty() ? "" : own_->texts.emplace_back(printable(text)).c_str();
    }
    /// For people; a long one is cut.
    const char* keepText(std::string text) {
        if (text.size() > kLongestText) {
            std::size_t end = kLongestText;
            while (end > 0 && (static_cast<unsigned char>(text[end]) & 0xC0U) == 0x80U) {
                --end;
            }
            text.resize(end);
        }
        return keep(text);
    }

    template <class Add>
    void each(const CatalogueRows& list, const std::string& name, const Add& add) {
        if (!list.isThere) {
            complain("it has no list of " + name);
        }
        for (const CatalogueRow& row : list.rows) {
            add(row);
        }
        if (list.hasMore) {
            complain("it has more than " + std::to_string(list.most) + " " + name);
        }
    }

    void addClass(const CatalogueRow& row) {
        const auto type = row.type;
        const std::string& name = row.name;
        if (!type || *type == 0 || !isClassName(name)) {
            complain("a class without a number or a good name: " + inQuotes(name));
            return;
        }
        if (!types_.insert(*type).second || !classNames_.insert(name).second || findClass(*type) != nullptr ||
            findClass(name) != nullptr) {
            complain("the class " + std::to_string(*type) + " '" + name + "' is another's already");
            refused_.insert(*type);
            return;
        }
        const auto naming = row.nameProperty ? NodeClass::Naming::byProperty
                            : row.several    ? NodeClass::Naming::byIndex
                                             : NodeClass::Naming::single;
        own_->classes.push_back({NodeType{*type}, keep(name), naming, row.nameProperty.value_or(0),
                                 own_->telling.emplace_back(row.telling)});
    }

    void addProperty(const CatalogueRow& row) {
        const auto type = row.nodeClass;
        const auto id = row.id;
        const std::string& name = row.name;
        const auto kind = kindNamed(row.kind);
        if (type && refused_.contains(*type)) {
            return;  // told with its class
        }
        if (!type || !id || !kind || !isPropertyName(name)) {
            complain("a property without a class, a number, a kind or a good name: " + inQuotes(name));
            return;
        }
        if (!types_.contains(*type)) {
            complain("the property " + name + " of a class that is not the plug-in's own");
            return;
        }
        if (!ids_.emplace(*type, *id).second || !names_.emplace(*type, lowered(name)).second) {
            complain("the property " + name + " is there twice");
            return;
        }
        Property added{NodeType{*type}, *id, keep(name), *kind, Unit::none, {}, keepText(row.meaning)};
        setUnit(added, row.unit);
        added.source = keepText(row.source);
        added.trusted = row.trusted;
        own_->properties.push_back(added);
    }

    void setUnit(Property& row, const std::string& name) {
        const auto known = std::ranges::find(kNamedUnits, name, &NamedUnit::name);
        if (known != kNamedUnits.end()) {
            row.unit = known->unit;
            row.unitText = known->shown;
        } else if (!name.empty()) {
            row.unit = Unit::other;
            row.unitText = keepText(name.substr(0, kLongestName));
        }
    }

    /// Whoever looks into the catalogue can do so until the process has ended, so it is never taken down.
    const CatalogueTable* kept() {
        static auto* const all = new std::vector<std::unique_ptr<OwnTable>>();
        if (own_->classes.empty()) {
            return nullptr;
        }
        own_->table.classes = own_->classes;
        own_->table.properties = {own_->properties};
        static std::mutex guard;
        const std::lock_guard lock(guard);
        return &all->emplace_back(std::move(own_))->table;
    }

    std::unique_ptr<OwnTable> own_ = std::make_unique<OwnTable>();
    std::vector<std::string> complaints_;
    std::set<unsigned int> types_;
    std::set<unsigned int> refused_;
    std::set<std::string> classNames_;
    std::set<std::pair<unsigned int, unsigned int>> ids_;
    std::set<std::pair<unsigned int, std::string>> names_;
};

}  // namespace

ParsedCatalogue parseCatalogue(const std::string& owner, std::string_view text) {
    return CatalogueParser(owner).parse(text);
}

}  // namespace cvagent
