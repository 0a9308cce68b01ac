#include "agent/cli/outcomes.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <nlohmann/json.hpp>
#include <thread>

#include "agent/change/processes.h"
#include "agent/cli/print.h"
#include "agent/verify/verify.h"

namespace cvagent {

namespace {

using Json = nlohmann::ordered_json;
using Clock = std::chrono::steady_clock;

constexpr std::chrono::milliseconds kBetweenLooks{200};
constexpr unsigned int kInterfaceName = 108;

/// What the kernel says of a value, where the plug-in says otherwise; "" where they agree.
std::string kernelSays(const MeantChange& change, const Reading& reading) {
    Reading name;
    name.id = kInterfaceName;
    name.value = IC::PropertyValue(change::interfaceNameOf(*change.node), true);
    try {
        const verify::Result found = verify::verify({change.node}, {{name, reading}});
        return found.differences.empty() ? "" : "; the kernel says " + found.differences.front().kernel;
    } catch (const Problem&) {
        return {};
    }
}

/// Who may have changed something back.
std::string suspects() {
    const std::vector<std::string> listeners = change::listenersToAddresses();
    if (listeners.empty()) {
        return "somebody has changed it back";
    }
    std::string text =
        "somebody has changed it back; the kernel's news of addresses and routes are heard by ";
    for (const std::string& each : listeners) {
        text += (&each == &listeners.front() ? "" : ", ") + each;
    }
    return text;
}

/// Whether it was written and can be looked at.
bool isWatched(const Outcome& outcome) {
    return outcome.kind == Outcome::applied || outcome.kind == Outcome::differs;
}

Outcome::Kind kindOf(WriteResult::Outcome outcome) {
    static constexpr std::array kKinds = {Outcome::applied, Outcome::differs, Outcome::notKnown};
    return kKinds.at(outcome);
}

/// For the record: it was as written, and is no more.
void announceLoss(Session& session, const MeantChange& change, const Outcome& outcome) {
    Event event = nodeEvent(Event::Kind::changed, *change.node);
    event.property = change.row->id;
    event.propertyName = change.row->name;
    event.before = event.wanted = static_cast<std::string>(change.value);
    event.after = outcome.after.failed() ? "" : static_cast<std::string>(outcome.after.value);
    event.verdict = "differs: " + outcome.reason;
    session.announce(event);
}

void look(Session& session, const MeantChange& change, Outcome& outcome, const Request& request) {
    const Found found = findNow(session, change, request);
    const bool wasSo = outcome.kind == Outcome::applied;
    outcome.kind = kindOf(found.standing.outcome);
    outcome.after = found.reading;
    outcome.reason = printable(found.standing.reason);
    if (outcome.kind == Outcome::differs) {
        outcome.reason += printable(kernelSays(change, found.reading));
        outcome.reason += wasSo ? "; " + suspects() : "";
    }
}

Json valueOf(const Reading& reading) {
    return reading.failed() ? Json(nullptr) : Json(static_cast<std::string>(reading.value));
}

}  // namespace

const char* verdictName(Outcome::Kind kind) {
    static constexpr std::array kNames = {"unchanged", "applied", "differs",
                                          "not known", "failed",  "not made"};
    return kNames.at(kind);
}

void verifyWithin(Session& session, const std::vector<MeantChange>& changes, std::vector<Outcome>& outcomes,
                  double seconds, const Request& request) {
    const auto deadline =
        Clock::now() + std::chrono::duration_cast<Clock::duration>(std::chrono::duration<double>(seconds));
    std::vector<bool> isLost(changes.size());  // changed back once: that is told, whatever comes then
    do {
        bool isAny = false;
        for (std::size_t i = 0; i < changes.size(); ++i) {
            const bool wasSo = outcomes[i].kind == Outcome::applied;
            if (isWatched(outcomes[i]) && !isLost[i]) {
                look(session, changes[i], outcomes[i], request);
                isLost[i] = wasSo && outcomes[i].kind == Outcome::differs;
                if (isLost[i]) {
                    announceLoss(session, changes[i], outcomes[i]);
                }
                isAny = isAny || (isWatched(outcomes[i]) && !isLost[i]);
            }
        }
        if (!isAny || Clock::now() + kBetweenLooks > deadline) {
            return;
        }
        std::this_thread::sleep_for(kBetweenLooks);
    } while (true);
}

std::string outcomesText(const std::vector<MeantChange>& changes, const std::vector<Outcome>& outcomes) {
    const Style& style = Style::detect();
    std::string text;
    for (std::size_t i = 0; i < changes.size(); ++i) {
        const Outcome& outcome = outcomes[i];
        const bool isGood = outcome.kind <= Outcome::applied;
        const std::string verdict = padded(verdictName(outcome.kind), 11);
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

std::string outcomesJson(const std::vector<MeantChange>& changes, const std::vector<Outcome>& outcomes) {
    Json list = Json::array();
    for (std::size_t i = 0; i < changes.size(); ++i) {
        const Outcome& outcome = outcomes[i];
        list.push_back({{"path", changes[i].node->getPath()},
                        {"property", {{"id", changes[i].row->id}, {"name", changes[i].row->name}}},
                        {"wanted", static_cast<std::string>(changes[i].value)},
                        {"before", valueOf(outcome.before)},
                        {"after", valueOf(outcome.after)},
                        {"verdict", verdictName(outcome.kind)},
                        {"reason", outcome.reason},
                        {"notes", outcome.notes}});
    }
    return Json{{"changes", std::move(list)}}.dump(2, ' ', false, Json::error_handler_t::replace) + "\n";
}

ExitStatus statusOf(const std::vector<Outcome>& outcomes) {
    const bool isGood = std::ranges::all_of(outcomes, [](const Outcome& outcome) {
        return outcome.kind <= Outcome::applied || outcome.kind == Outcome::notKnown;
    });
    return isGood ? ExitStatus::done : ExitStatus::failed;
}

}  // namespace cvagent
