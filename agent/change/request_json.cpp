#include "agent/change/request_json.h"

#include "agent/change/json_parts.h"

namespace cvagent::change {

namespace {

template <class Read>
auto parsed(std::string_view text, const Read& read) {
    try {
        return read(parsedParts(text));
    } catch (const nlohmann::json::exception& damaged) {
        throw BadPlan(damaged.what());
    }
}

}  // namespace

std::string toJson(const RehearsalRequest& request) {
    return Json{{"plugins", texts(request.plugins)},
                {"data", bytes(request.dataDirectory)},
                {"tools", static_cast<unsigned>(request.hostTools)},
                {"commands", static_cast<unsigned>(request.commands)},
                {"changes", list(request.changes, changeObject)}}
        .dump();
}

RehearsalRequest requestFromJson(std::string_view json) {
    return parsed(json, [](const Json& request) {
        RehearsalRequest asked;
        asked.plugins = textsFrom(request.at("plugins"));
        asked.dataDirectory = bytesFrom(request.at("data"));
        asked.hostTools = static_cast<HostTools>(request.at("tools").get<unsigned>());
        asked.commands = static_cast<Commands>(request.at("commands").get<unsigned>());
        asked.changes = listFrom<Change>(request.at("changes"), changeFrom);
        return asked;
    });
}

std::string answerOf(const Plan& plan) {
    return Json{{"plan", planObject(plan)}}.dump();
}

std::string answerOf(const std::string& cannot) {
    return Json{{"cannot", bytes(cannot)}}.dump();
}

RehearsalAnswer answerFromJson(std::string_view json) {
    return parsed(json, [](const Json& answer) {
        return answer.contains("cannot") ? RehearsalAnswer{bytesFrom(answer.at("cannot")), {}}
                                         : RehearsalAnswer{"", planFrom(answer.at("plan"))};
    });
}

}  // namespace cvagent::change
