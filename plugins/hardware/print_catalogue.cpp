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

void printCatalogue() {
    const std::vector<hardware::Row> rows = hardware::allRows();
    Json json{{"plugin", "hardware"}, {"classes", Json::array()}, {"properties", Json::array()}};
    for (const hardware::ClassRow& row : hardware::classes()) {
        Json one{{"type", static_cast<unsigned int>(row.type)}, {"name", row.name}};
        if (row.several) {
            one["nameProperty"] = hardware::firstId(row.type);
        }
        if (*row.telling != '\0') {
            one["telling"] = idsOf(row, rows);
        }
        json["classes"].push_back(one);
    }
    for (const hardware::Row& row : rows) {
        json["properties"].push_back({{"class", static_cast<unsigned int>(hardware::classOfId(row.id))},
                                      {"id", row.id},
                                      {"name", row.name},
                                      {"kind", kKindNames.at(static_cast<std::size_t>(row.kind))},
                                      {"unit", row.unit},
                                      {"source", row.source},
                                      {"meaning", row.meaning},
                                      {"trusted", row.traits.trusted}});
    }
    std::puts(json.dump(1).c_str());
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
