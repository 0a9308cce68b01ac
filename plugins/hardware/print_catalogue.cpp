// Prints the plug-in's catalogue as the file that lies beside the library: one table for code and readers.
#include <algorithm>
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

const char* kindName(hardware::Kind kind) {
    switch (kind) {
        case hardware::Kind::text:
            return "text";
        case hardware::Kind::texts:
            return "texts";
        case hardware::Kind::number:
            return "number";
        case hardware::Kind::flag:
            break;
    }
    return "flag";
}

/// Throws when the class has no property of a name.
Json idsOf(const hardware::ClassRow& type, const std::vector<hardware::Row>& rows) {
    Json ids = Json::array();
    std::istringstream names(type.telling);
    for (std::string name; names >> name;) {
        const auto row = std::ranges::find_if(
            rows, [&](const hardware::Row& one) { return one.type == type.type && one.name == name; });
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
        json["properties"].push_back({{"class", static_cast<unsigned int>(row.type)},
                                      {"id", row.id},
                                      {"name", row.name},
                                      {"kind", kindName(row.kind)},
                                      {"unit", row.unit},
                                      {"source", row.source},
                                      {"meaning", row.meaning},
                                      {"trusted", row.audience == hardware::Audience::trusted}});
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
