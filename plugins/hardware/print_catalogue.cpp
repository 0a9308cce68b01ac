// Prints the plug-in's catalogue as the file that lies beside the library: one table for code and readers.
#include <cstdio>
#include <nlohmann/json.hpp>

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

}  // namespace

int main() {
    Json json{{"plugin", "hardware"}, {"classes", Json::array()}, {"properties", Json::array()}};
    for (const hardware::ClassRow& row : hardware::classes()) {
        Json one{{"type", static_cast<unsigned int>(row.type)}, {"name", row.name}};
        if (row.several) {
            one["nameProperty"] = hardware::firstId(row.type);
        }
        json["classes"].push_back(one);
    }
    for (const hardware::Row& row : hardware::allRows()) {
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
    return 0;
}
