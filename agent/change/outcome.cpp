#include "agent/change/outcome.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <iterator>
#include <thread>

#include "agent/change/interface_settings.h"
#include "agent/change/processes.h"
#include "agent/core/text.h"
#include "agent/verify/verify.h"

namespace cvagent::change {

namespace {

using Clock = std::chrono::steady_clock;

constexpr std::chrono::milliseconds kBetweenLooks{200};
constexpr unsigned int kNameOfLink = 108;
/// In the order of Outcome::Kind.
constexpr std::array kVerdictNames = {"unchanged", "applied", "differs", "not known", "failed", "not made"};

/// What the kernel says of a value, where the plug-in says otherwise; "" where they agree.
std::string kernelSays(const MeantChange& change, const Reading& reading) {
    Reading name;
    name.id = kNameOfLink;
    name.value = IC::PropertyValue(interfaceNameOf(*change.node), true);
    try {
        const verify::Result found = verify::verify({change.node}, {{name, reading}});
        const auto own =
            std::ranges::find(found.differences, change.row->name, &verify::Difference::property);
        return own == found.differences.end() ? "" : "; the kernel says " + own->kernel;
    } catch (const Problem&) {
        return {};
    }
}

/// Who may have changed something back.
std::string suspects() {
    const std::vector<std::string> listeners = listenersToAddresses();
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

/// For the record: it was as written, and is no more.
void announceLoss(ChangedHost& host, const MeantChange& change, const Outcome& outcome) {
    Event event = nodeEvent(Event::Kind::changed, *change.node);
    event.property = change.row->id;
    event.propertyName = change.row->name;
    event.before = event.wanted = static_cast<std::string>(change.value);
    event.after = outcome.after.failed() ? "" : static_cast<std::string>(outcome.after.value);
    event.verdict = "differs: " + outcome.reason;
    host.announce(event);
}

/// Once more where it seems lost: who sets something anew takes the old away first.
Found findSettled(ChangedHost& host, const MeantChange& change, bool wasSo, const Request& request) {
    Found found = findNow(host, change, request);
    if (wasSo && found.standing.outcome == WriteResult::differs) {
        std::this_thread::sleep_for(kBetweenLooks);
        found = findNow(host, change, request);
    }
    return found;
}

void look(ChangedHost& host, const MeantChange& change, Outcome& outcome, const Request& request) {
    const bool wasSo = outcome.kind == Outcome::applied;
    const Found found = findSettled(host, change, wasSo, request);
    outcome.kind = kindOf(found.standing.outcome);
    outcome.after = found.reading;
    outcome.reason = printable(found.standing.reason);
    if (outcome.kind == Outcome::differs) {
        outcome.reason += printable(kernelSays(change, found.reading));
        outcome.reason += wasSo ? "; " + suspects() : "";
    }
}

}  // namespace

const char* verdictName(Outcome::Kind kind) {
    return kVerdictNames.at(kind);
}

std::optional<Outcome::Kind> verdictNamed(const std::string& name) {
    const auto found = std::ranges::find(kVerdictNames, name);
    return found == kVerdictNames.end()
               ? std::nullopt
               : std::optional(static_cast<Outcome::Kind>(found - kVerdictNames.begin()));
}

Outcome::Kind kindOf(WriteResult::Outcome outcome) {
    static constexpr std::array kKinds = {Outcome::applied, Outcome::differs, Outcome::notKnown};
    return kKinds.at(outcome);
}

void verifyWithin(ChangedHost& host, const std::vector<MeantChange>& changes, std::vector<Outcome>& outcomes,
                  double seconds, const Request& request, const std::function<bool()>& goesOn) {
    const auto deadline =
        Clock::now() + std::chrono::duration_cast<Clock::duration>(std::chrono::duration<double>(seconds));
    std::vector<bool> isLost(changes.size());  // changed back once: that is told, whatever comes then
    do {
        bool isAny = false;
        for (std::size_t i = 0; i < changes.size(); ++i) {
            const bool wasSo = outcomes[i].kind == Outcome::applied;
            if (isWatched(outcomes[i]) && !isLost[i]) {
                look(host, changes[i], outcomes[i], request);
                isLost[i] = wasSo && outcomes[i].kind == Outcome::differs;
                if (isLost[i]) {
                    announceLoss(host, changes[i], outcomes[i]);
                }
                isAny = isAny || (isWatched(outcomes[i]) && !isLost[i]);
            }
        }
        const bool ends = goesOn && !goesOn();
        if (!isAny || ends || Clock::now() + kBetweenLooks > deadline) {
            return;
        }
        std::this_thread::sleep_for(kBetweenLooks);
    } while (true);
}

}  // namespace cvagent::change
