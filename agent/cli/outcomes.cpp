#include "agent/cli/outcomes.h"

#include <algorithm>
#include <nlohmann/json.hpp>

#include "agent/cli/print.h"

namespace cvagent {

namespace {

using change::Outcome;
using Json = nlohmann::ordered_json;

Json valueOf(const Reading& reading) {
    return reading.failed() ? Json(nullptr) : Json(static_cast<std::string>(reading.value));
}

}  // namespace

std::string outcomesText(const std::vector<change::MeantChange>& changes,
                         const std::vector<change::Outcome>& outcomes) {
    const Style& style = Style::detect();
    std::string text;
    for (std::size_t i = 0; i < changes.size(); ++i) {
        const Outcome& outcome = outcomes[i];
        const bool isGood = outcome.kind <= Outcome::applied;
        const std::string verdict = padded(change::verdictName(outcome.kind), 11);
        text += (isGood ? style.good(verdict) : style.bad(verdict)) + printable(changes[i].target());
        if (outcome.kind != Outcome::notMade && !outcome.after.failed()) {
            text += "  " + valueText(changes[i].row, outcome.after.value);
        }
        text += "\n";
        for (const std::string& note : outcome.notes) {
            text += "           " + printable(note) + "\n";
        }
        text += outcome.reason.empty() ? "" : "           " + outcome.reason + "\n";
    }
    return text;
}

std::string outcomesJson(const std::vector<change::MeantChange>& changes,
                         const std::vector<change::Outcome>& outcomes) {
    Json list = Json::array();
    for (std::size_t i = 0; i < changes.size(); ++i) {
        const Outcome& outcome = outcomes[i];
        list.push_back({{"path", changes[i].node->getPath()},
                        {"property", {{"id", changes[i].row->id}, {"name", changes[i].row->name}}},
                        {"wanted", static_cast<std::string>(changes[i].value)},
                        {"before", valueOf(outcome.before)},
                        {"after", valueOf(outcome.after)},
                        {"verdict", change::verdictName(outcome.kind)},
                        {"reason", outcome.reason},
                        {"notes", outcome.notes}});
    }
    return Json{{"changes", std::move(list)}}.dump(2, ' ', false, Json::error_handler_t::replace) + "\n";
}

ExitStatus statusOf(const std::vector<change::Outcome>& outcomes) {
    const bool isGood = std::ranges::all_of(outcomes, [](const Outcome& outcome) {
        return outcome.kind <= Outcome::applied || outcome.kind == Outcome::notKnown;
    });
    return isGood ? ExitStatus::done : ExitStatus::failed;
}

}  // namespace cvagent
