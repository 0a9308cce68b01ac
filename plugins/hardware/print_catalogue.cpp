// Prints the plug-in's catalogue as the file that lies beside the library: one table for code and readers.
#include <algorithm>
#include <array>
#include <cstdio>
#include <exception>
#include <iostream>
#include <nlohmann/json.hpp>
#include <sstream>
#include <stdexcept>
#include <string>
#include <vector>

#include "plugins/hardware/sources.h"

namespace {

using Json = nlohmann::ordered_json;

// By their values.
constexpr std::array kKindNames = {"text", "texts", "number", "flag"};

/// Throws when the class has no property of a name.
Json idsOf(const hardware::ClassRow& type, const std::vector<hardware::Row>& rows) {
    Json ids = Json::array();
    std::istringstream names(type.telling);
    for (std::string name; names >> name;) {
        const auto row = std::ranges::find_if(rows, [&](const hardware::Row& one) {
            return hardware::classOfId(one.id) == type.type && one.name == name;
        });
        if (row == rows.end()) {
            throw std::logic_error(std::string(type.name) + " has no property " + name);
        }
        ids.push_back(row->id);
    }
    return ids;
}

Json classObject(const hardware::ClassRow& row, const std::vector<hardware::Row>& rows) {
    Json one{{"type", static_cast<unsigned int>(row.type)}, {"name", row.name}};
    if (row.several) {
        one["nameProperty"] = hardware::firstId(row.type);
    }
    if (*row.telling != '\0') {
        one["telling"] = idsOf(row, rows);
    }
    return one;
}

/// What holds where nothing is said is left out: each command that shows a node reads the file.
Json propertyObject(const hardware::Row& row) {
    Json one{{"class", static_cast<unsigned int>(hardware::classOfId(row.id))},
             {"id", row.id},
             {"name", row.name},
             {"kind", kKindNames.at(static_cast<std::size_t>(row.kind))}};
    if (*row.unit != '\0') {
        one["unit"] = row.unit;
    }
    one["source"] = row.source;
    one["meaning"] = row.meaning;
    if (row.traits.trusted) {
        one["trusted"] = true;
    }
    return one;
}

/// A line for each row.
template <class Rows, class Make>
std::string listOf(const Rows& rows, const Make& make) {
    std::string text;
    for (const auto& row : rows) {
        text += (text.empty() ? "[\n" : ",\n") + make(row).dump();
    }
    return text + "]";
}

void printCatalogue() {
    const std::vector<hardware::Row> rows = hardware::allRows();
    const std::string classes =
        listOf(hardware::classes(), [&rows](const auto& row) { return classObject(row, rows); });
    std::cout << R"({"plugin": "hardware", "classes": )" << classes << R"(, "properties": )"
              << listOf(rows, propertyObject) << "}\n";
}

}  // namespace

int main() {
    try {
        printCatalogue();
        return 0;
    } catch (const std::exception& failure) {
        std::cerr << "print_catalogue: " << failure.what() << '\n';
        return 1;
    }
}
