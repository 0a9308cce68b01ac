#include "agent/change/json_parts.h"

#include "agent/change/base64.h"

namespace cvagent::change {

namespace {

/// JSON has characters, files have bytes.
bool isUtf8(const std::string& text) {
    try {
        static_cast<void>(Json(text).dump());
        return true;
    } catch (const Json::type_error&) {
        return false;
    }
}

/// The answer, its plan, the files, one of them, a state, its content in base64.
constexpr int kDeepestPlan = 6;

}  // namespace

Json parsedParts(std::string_view text) {
    try {
        return Json::parse(text, [](int depth, Json::parse_event_t /*event*/, Json& /*part*/) {
            if (depth > kDeepestPlan) {
                throw BadPlan("it has more levels than a plan has");
            }
            return true;
        });
    } catch (const Json::exception& damaged) {
        throw BadPlan(damaged.what());
    }
}

Json bytes(const std::string& text) {
    return isUtf8(text) ? Json(text) : Json{{"base64", toBase64(text)}};
}

std::string bytesFrom(const Json& json) {
    if (json.is_string()) {
        return json.get<std::string>();
    }
    const auto plain = fromBase64(json.at("base64").get<std::string>());
    if (!plain) {
        throw BadPlan("a damaged base64 text");
    }
    return *plain;
}

Json texts(const std::vector<std::string>& all) {
    Json list = Json::array();
    for (const std::string& text : all) {
        list.push_back(bytes(text));
    }
    return list;
}

std::vector<std::string> textsFrom(const Json& json) {
    std::vector<std::string> all;
    if (!json.is_array()) {
        throw BadPlan("what should be a list is none");
    }
    for (const Json& text : json) {
        all.push_back(bytesFrom(text));
    }
    return all;
}

Json changeObject(const Change& change) {
    return {{"node", bytes(change.node)}, {"property", change.property}, {"words", texts(change.words)}};
}

Change changeFrom(const Json& json) {
    return {bytesFrom(json.at("node")), json.at("property").get<unsigned int>(), textsFrom(json.at("words"))};
}

}  // namespace cvagent::change
