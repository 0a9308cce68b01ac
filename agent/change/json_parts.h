#pragma once

#include <nlohmann/json.hpp>
#include <string>
#include <string_view>
#include <vector>

#include "agent/change/change.h"
#include "agent/change/plan.h"

/// Parts of the documents that plans travel in.
namespace cvagent::change {

using Json = nlohmann::ordered_json;

// JSON has characters, the host's files and names have bytes: what is no UTF-8 becomes {"base64": ...}.

Json bytes(const std::string& text);
Json texts(const std::vector<std::string>& all);

/// A document of another process: no deeper than a plan is. Throws BadPlan.
Json parsedParts(std::string_view text);

// What reads them throws BadPlan or nlohmann::json::exception.

std::string bytesFrom(const Json& json);
std::vector<std::string> textsFrom(const Json& json);

Json changeObject(const Change& change);
Change changeFrom(const Json& json);
Json planObject(const Plan& plan);
Plan planFrom(const Json& json);

template <class Each>
Json list(const std::vector<Each>& all, Json (*one)(const Each&)) {
    Json made = Json::array();
    for (const Each& each : all) {
        made.push_back(one(each));
    }
    return made;
}

template <class Each>
std::vector<Each> listFrom(const Json& json, Each (*one)(const Json&)) {
    if (!json.is_array()) {
        throw BadPlan("what should be a list is none");
    }
    std::vector<Each> made;
    for (const Json& each : json) {
        made.push_back(one(each));
    }
    return made;
}

}  // namespace cvagent::change
