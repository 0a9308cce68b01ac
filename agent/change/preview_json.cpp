#include "agent/change/json_parts.h"
#include "agent/change/proposal.h"

namespace cvagent::change {

namespace {

Json targetObject(const Preview::Target& target) {
    return {{"path", bytes(target.path)}, {"property", target.property}};
}

Json objectionObject(const Preview::Target& target) {
    Json json = targetObject(target);
    json["reason"] = bytes(target.reason);
    return json;
}

Preview::Target targetFrom(const Json& json) {
    return {bytesFrom(json.at("path")), json.at("property").get<std::string>(),
            json.contains("reason") ? bytesFrom(json.at("reason")) : ""};
}

}  // namespace

std::string toJson(const Preview& preview) {
    return Json{{"objections", list(preview.objections, objectionObject)},
                {"unchanged", list(preview.unchanged, targetObject)},
                {"plan", planObject(preview.plan)}}
        .dump(2);
}

Preview previewFromJson(std::string_view json) {
    try {
        const Json whole = Json::parse(json);
        return {listFrom<Preview::Target>(whole.at("objections"), targetFrom),
                listFrom<Preview::Target>(whole.at("unchanged"), targetFrom), planFrom(whole.at("plan"))};
    } catch (const nlohmann::json::exception& damaged) {
        throw BadPlan(damaged.what());
    }
}

}  // namespace cvagent::change
