#include <sys/stat.h>

#include <algorithm>
#include <array>
#include <nlohmann/json.hpp>

#include "agent/change/json_parts.h"
#include "agent/change/plan.h"

namespace cvagent::change {

namespace {

constexpr std::array<const char*, 4> kTypes = {"file", "link", "directory", "other"};
constexpr mode_t kModeBits = 07777;

Json fileState(const std::optional<FileState>& state) {
    if (!state) {
        return nullptr;
    }
    return {{"type", kTypes.at(static_cast<std::size_t>(state->type))},
            {"mode", state->mode},
            {"owner", state->owner},
            {"group", state->group},
            {"content", bytes(state->content)},
            {"withheld", state->withheld}};
}

std::optional<FileState> fileStateFrom(const Json& json) {
    if (json.is_null()) {
        return std::nullopt;
    }
    const auto type = std::ranges::find(kTypes, json.at("type").get<std::string>());
    if (type == kTypes.end()) {
        throw BadPlan("a file of no known type");
    }
    FileState state;
    state.type = static_cast<FileState::Type>(type - kTypes.begin());
    state.content = bytesFrom(json.at("content"));
    state.mode = json.at("mode").get<mode_t>() & kModeBits;
    state.owner = json.at("owner").get<uid_t>();
    state.group = json.at("group").get<gid_t>();
    state.withheld = json.at("withheld").get<bool>();
    return state;
}

Json answerObject(const Answer& answer) {
    return {{"node", bytes(answer.node)},       {"property", bytes(answer.property)},
            {"problem", bytes(answer.problem)}, {"errors", texts(answer.errors)},
            {"before", bytes(answer.before)},   {"after", bytes(answer.after)},
            {"lacking", bytes(answer.lacking)}};
}

Answer answerFrom(const Json& json) {
    Answer answer;
    answer.node = bytesFrom(json.at("node"));
    answer.property = bytesFrom(json.at("property"));
    answer.problem = bytesFrom(json.at("problem"));
    answer.errors = textsFrom(json.at("errors"));
    answer.before = bytesFrom(json.at("before"));
    answer.after = bytesFrom(json.at("after"));
    answer.lacking = bytesFrom(json.at("lacking"));
    return answer;
}

Json commandObject(const PlannedCommand& command) {
    return {{"text", bytes(command.text)}, {"recorded", command.recorded}, {"change", command.change}};
}

PlannedCommand commandFrom(const Json& json) {
    return {bytesFrom(json.at("text")), json.at("recorded").get<bool>(),
            json.at("change").get<std::size_t>()};
}

Json fileChange(const FileChange& file) {
    return {{"path", bytes(file.path)}, {"before", fileState(file.before)}, {"after", fileState(file.after)}};
}

FileChange fileChangeFrom(const Json& json) {
    return {bytesFrom(json.at("path")), fileStateFrom(json.at("before")), fileStateFrom(json.at("after"))};
}

void checkTogether(const Plan& plan) {
    if (plan.answers.size() != plan.changes.size()) {
        throw BadPlan("not one answer for each change");
    }
    for (const PlannedCommand& command : plan.commands) {
        if (command.change >= plan.changes.size()) {
            throw BadPlan("a command of no change");
        }
    }
}

/// Whether every directory above lets everybody in; one that is not there yet does.
bool isReachedByEverybody(const std::string& path) {
    for (std::size_t end = path.rfind('/'); end != std::string::npos && end > 0;
         end = path.rfind('/', end - 1)) {
        struct stat found {};
        if (stat(path.substr(0, end).c_str(), &found) == 0 && (found.st_mode & S_IXOTH) == 0) {
            return false;
        }
    }
    return true;
}

bool isForEverybody(const FileState& state) {
    return state.type != FileState::Type::file || (state.mode & S_IROTH) != 0;
}

void withhold(std::optional<FileState>& state) {
    if (state) {
        state->content.clear();
        state->withheld = true;
    }
}

}  // namespace

Plan planFrom(const Json& json) {
    Plan plan;
    plan.changes = listFrom<Change>(json.at("changes"), changeFrom);
    plan.answers = listFrom<Answer>(json.at("answers"), answerFrom);
    plan.files = listFrom<FileChange>(json.at("files"), fileChangeFrom);
    plan.commands = listFrom<PlannedCommand>(json.at("commands"), commandFrom);
    plan.kernelBefore = textsFrom(json.at("kernelBefore"));
    plan.kernelAfter = textsFrom(json.at("kernelAfter"));
    plan.unforeseen = textsFrom(json.at("unforeseen"));
    checkTogether(plan);
    return plan;
}

Json planObject(const Plan& plan) {
    return {{"changes", list(plan.changes, changeObject)}, {"answers", list(plan.answers, answerObject)},
            {"files", list(plan.files, fileChange)},       {"commands", list(plan.commands, commandObject)},
            {"kernelBefore", texts(plan.kernelBefore)},    {"kernelAfter", texts(plan.kernelAfter)},
            {"unforeseen", texts(plan.unforeseen)}};
}

std::string toJson(const Plan& plan) {
    return planObject(plan).dump(2);
}

Plan planFromJson(std::string_view json) {
    try {
        return planFrom(Json::parse(json));
    } catch (const nlohmann::json::exception& damaged) {
        throw BadPlan(damaged.what());
    }
}

Plan withoutSecrets(Plan plan) {
    for (FileChange& file : plan.files) {
        const bool open = isReachedByEverybody(file.path) && (!file.before || isForEverybody(*file.before)) &&
                          (!file.after || isForEverybody(*file.after));
        if (!open) {
            withhold(file.before);
            withhold(file.after);
        }
    }
    return plan;
}

}  // namespace cvagent::change
