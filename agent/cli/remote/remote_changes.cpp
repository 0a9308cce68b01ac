// Plans and changes that the service makes.
#include <algorithm>

#include "agent/bus/writer.h"
#include "agent/cli/print.h"
#include "agent/cli/remote/answer_errors.h"
#include "agent/cli/remote/remote_session.h"
#include "agent/cli/remote/service.h"
#include "agent/cli/remote/values.h"

namespace cvagent::remote {

namespace {

constexpr const char* kOutcome = "uu(uyvtus)(uyvtus)ssbssas";
/// The service looks no longer; nobody else can change anything meanwhile.
constexpr double kLongestLook = 60;

bool isError(const bus::Message& answer, const char* name) {
    return answer.isError() && answer.error().name() == name;
}

change::Outcome takeOutcome(bus::Reader& reader, const change::MeantChange& change) {
    change::Outcome outcome;
    reader.structure(kOutcome, [&] {
        reader.skip();
        reader.skip();
        outcome.before = takeReading(reader);
        outcome.after = takeReading(reader);
        outcome.kind = change::verdictNamed(reader.text()).value_or(change::Outcome::notKnown);
        outcome.reason = printable(reader.text());
        outcome.complained = reader.flag();
        outcome.lacking = reader.text();
        if (const std::string problem = reader.text(); !problem.empty()) {
            outcome.problem.emplace(kindNamed(problem), outcome.reason);
        }
        outcome.notes = reader.texts();
    });
    outcome.before.row = outcome.after.row = change.row;
    return outcome;
}

void addFlag(bus::Writer& writer, const char* name, bool value) {
    writer.entry("sv", [&] { writer.put(name).variant("b", [&] { writer.put(value); }); });
}

void addSeconds(bus::Writer& writer, const char* name, double value) {
    writer.entry("sv", [&] { writer.put(name).variant("d", [&] { writer.put(value); }); });
}

/// Who has to confirm the change is told of it at once, and it is looked at afterwards.
double longestLook(const ApplyOptions& options) {
    return options.confirmSeconds ? 0 : kLongestLook;
}

/// It knows no changes that wait for their confirmation.
bool isOlderService(const bus::Message& answer, const ApplyOptions& options) {
    return isError(answer, bus::kUnknownMethod) ||
           (options.confirmSeconds && isError(answer, bus::kInvalidArgs));
}

void putOptions(bus::Writer& writer, const ApplyOptions& options) {
    writer.array("{sv}", [&] {
        addFlag(writer, "force", options.force);
        addFlag(writer, "plain", options.plain);
        if (options.verifySeconds) {
            addSeconds(writer, "verify-within", std::min(*options.verifySeconds, longestLook(options)));
        }
        if (options.confirmSeconds) {
            addSeconds(writer, "confirm-within", *options.confirmSeconds);
            addFlag(writer, "unguarded", options.unguarded);
        }
    });
}

void complainOfLines(const std::string& text) {
    std::string lines;
    for (std::size_t at = 0; at <= text.size();) {
        const std::size_t end = std::min(text.find('\n', at), text.size());
        lines += (at == 0 ? "" : "\n") + printable(text.substr(at, end - at));
        at = end + 1;
    }
    complain(lines);
}

void showReported(const std::vector<std::string>& texts) {
    ErrorLines lines;
    for (const std::string& text : texts) {
        lines.add(text);
    }
    showLines(lines);
}

}  // namespace

/// The nodes are those that were found before, whatever is called the same by now.
bus::Message RemoteSession::changesCall(const char* member, const std::vector<change::MeantChange>& changes) {
    bus::Message call = client_->call(member);
    bus::Writer writer(call);
    writer.array("(ssv)", [&] {
        for (const change::MeantChange& change : changes) {
            writer.structure("ssv", [&] {
                writer.put(std::to_string(change.node->getNodeId())).put(std::to_string(change.row->id));
                putWords(writer, change.words);
            });
        }
    });
    if (asksPerson_) {
        call.allowInteraction();
    }
    return call;
}

std::unique_ptr<change::Preview> RemoteSession::preview(const std::vector<change::MeantChange>& changes) {
    const bus::Message answer = client_->waitForLong(changesCall("Plan", changes));
    if (isError(answer, bus::kUnknownMethod)) {
        complain("the service is older than this cvagent and makes no plans");
        return nullptr;
    }
    if (isError(answer, bus::kAccessDenied)) {
        complain("the service does not let you have its plan: " + printable(answer.error().what()));
        return nullptr;
    }
    try {
        client_->checkAnswer(answer);
    } catch (const ServiceProblem& problem) {
        if (problem.subject() != Problem::plan) {
            throw;
        }
        complain(std::string("the service makes no plan: ") + printable(problem.what()));
        return nullptr;
    }
    std::string text;
    client_->read(answer, [&text](bus::Reader& reader) { text = reader.text(); });
    try {
        return std::make_unique<change::Preview>(change::previewFromJson(text));
    } catch (const change::BadPlan&) {
        client_->failOtherVersion();
    }
}

std::unique_ptr<std::vector<change::Outcome>> RemoteSession::apply(
    const std::vector<change::MeantChange>& changes, const ApplyOptions& options) {
    const bus::Message call = changesCall("Apply", changes);
    bus::Writer writer(call);
    putOptions(writer, options);
    bus::Message answer;
    try {
        answer = client_->waitForLong(call);
        if (isOlderService(answer, options)) {
            complain("the service is older than this cvagent: the changes are made by single writes");
            return nullptr;
        }
        client_->checkAnswer(answer);
    } catch (const ServiceGone& gone) {
        const bool isOne = changes.size() == 1;
        throw Failure(ExitStatus::failed,
                      std::string(gone.what()) + "; " +
                          (isOne ? changes.front().row->name + std::string(" may be changed, or not, ")
                                 : std::string("all changes may be made, or none, or some of them, ")) +
                          "or only in part: read " + (isOne ? "it" : "them") + " again");
    }
    auto outcomes = std::make_unique<std::vector<change::Outcome>>();
    client_->read(answer, [&](bus::Reader& reader) {
        reader.array((std::string("(") + kOutcome + ")").c_str(), [&] {
            if (outcomes->size() == changes.size()) {
                throw bus::Error(bus::kInvalidArgs, "more outcomes than changes");
            }
            outcomes->push_back(takeOutcome(reader, changes[outcomes->size()]));
        });
        if (outcomes->size() != changes.size()) {
            throw bus::Error(bus::kInvalidArgs, "fewer outcomes than changes");
        }
        std::ranges::for_each(reader.texts(), complainOfLines);
        showReported(reader.texts());
    });
    if (const double rest = options.verifySeconds.value_or(0) - longestLook(options); rest > 0) {
        change::verifyWithin(*this, changes, *outcomes, rest, Request(""));
    }
    return outcomes;
}

}  // namespace cvagent::remote
