#include "agent/service/change_request.h"

#include <cmath>

#include "agent/core/property_words.h"
#include "agent/core/text.h"
#include "agent/service/log.h"
#include "agent/service/values.h"

namespace cvagent::service {

namespace {

/// While it is looked at what was written, others wait.
constexpr double kLongestVerify = 60;

[[noreturn]] void failTooMuch(const std::string& text) {
    throw bus::Error(bus::kLimitsExceeded, text);
}

std::size_t sizeOf(const change::NamedChange& change) {
    std::size_t size = change.node.size() + change.property.size();
    for (const std::string& word : change.words) {
        size += word.size();
    }
    return size;
}

change::NamedChange takeChange(bus::Reader& reader, const std::string& place) {
    change::NamedChange change;
    change.place = place;
    reader.structure("ssv", [&] {
        change.node = reader.text();
        change.property = reader.text();
        change.words = takeWords(reader);
    });
    if (change.words.size() > change::kMostWords) {
        failTooMuch(place + " has more than " + std::to_string(change::kMostWords) + " words");
    }
    if (change.words.empty()) {
        change.words.emplace_back();  // an empty list
    }
    return change;
}

bool takeFlag(bus::Reader& reader, const std::string& type, const std::string& name) {
    if (type != "b") {
        throw bus::Error(bus::kInvalidArgs, name + " is a flag (b)");
    }
    return reader.flag();
}

double takeSeconds(bus::Reader& reader, const std::string& type, const std::string& name, double longest) {
    const double seconds = type == "d" ? reader.real() : -1;
    judgeSeconds(seconds, name, longest);
    return seconds;
}

void takeWish(bus::Reader& reader, const std::string& type, const std::string& name, ApplyWishes& wishes) {
    if (name == "force") {
        wishes.force = takeFlag(reader, type, name);
    } else if (name == "plain") {
        wishes.plain = takeFlag(reader, type, name);
    } else if (name == "unguarded") {
        wishes.unguarded = takeFlag(reader, type, name);
    } else if (name == "verify-within") {
        wishes.verifySeconds = takeSeconds(reader, type, name, kLongestVerify);
    } else if (name == "confirm-within") {
        const double seconds = takeSeconds(reader, type, name, kLongestConfirmation);
        wishes.confirmSeconds = seconds > 0 ? std::optional(seconds) : std::nullopt;
    } else {
        throw bus::Error(bus::kInvalidArgs, "there is no option " + inQuotes(name));
    }
}

void noteDenied(const Caller& caller, const ChangeQuestion& question,
                const std::vector<change::MeantChange>& changes, const std::string& reason) {
    const bool isOne = changes.size() == 1;
    const std::string what = isOne ? changes.front().target() : std::to_string(changes.size()) + " changes";
    const std::string user = std::to_string(caller.user);
    const std::string text = "uid " + user + " may not " + question.deed + " " + what + ": " + reason;
    if (question.isWrite) {
        const std::string node = isOne ? changes.front().node->getPath() : "";
        noteWrite(Priority::warning, {node, isOne ? changes.front().row->name : "", caller.user}, text,
                  "denied");
    } else {
        log(Priority::warning, text, {{"CORVISTA_CALLER_UID", user}});
    }
}

void askWhetherAllowed(const CallPointer& call, const Caller& caller, const ChangeQuestion& question,
                       const std::vector<change::MeantChange>& changes, const MayChange& next) {
    const std::string what = changes.empty()       ? "nothing"
                             : changes.size() == 1 ? changes.front().target()
                                                   : changes.front().target() + " and " +
                                                         std::to_string(changes.size() - 1) + " more";
    const Consent::Question asked{question.audience(changes), question.deed + " " + what,
                                  call->message().allowsInteraction()};
    call->parts().consent.ask(
        caller, asked, [call, caller, question, changes, next](bool allowed, const std::string& why) {
            call->guarded([&] {
                if (!allowed) {
                    noteDenied(caller, question, changes, why);
                    throw bus::Error(bus::kAccessDenied, "you may not " + question.deed + " this: " + why);
                }
                next(caller, changes);
            });
        });
}

}  // namespace

void judgeSeconds(double seconds, const std::string& name, double longest) {
    if (!std::isfinite(seconds) || seconds < 0 || seconds > longest) {
        throw bus::Error(bus::kInvalidArgs, name + " is a number of seconds (d) from 0 to " +
                                                std::to_string(std::lround(longest)));
    }
}

std::vector<change::NamedChange> takeChanges(bus::Reader& reader) {
    std::vector<change::NamedChange> changes;
    std::size_t size = 0;
    reader.array("(ssv)", [&] {
        if (changes.size() == change::kMostChanges) {
            failTooMuch("more than " + std::to_string(change::kMostChanges) + " changes in one call");
        }
        changes.push_back(takeChange(reader, "changes[" + std::to_string(changes.size()) + "]"));
        size += sizeOf(changes.back());
        if (size > change::kLongestChangeFile) {
            failTooMuch("the changes are longer than " + std::to_string(change::kLongestChangeFile) +
                        " bytes");
        }
    });
    if (changes.size() == 1) {
        changes.front().place.clear();  // which one is meant is no question
    }
    return changes;
}

ApplyWishes takeWishes(bus::Reader& reader) {
    ApplyWishes wishes;
    reader.array("{sv}", [&] {
        reader.entry("sv", [&] {
            const std::string name = reader.text();
            reader.variant([&](const std::string& type) { takeWish(reader, type, name, wishes); });
        });
    });
    return wishes;
}

void ifAllowed(const CallPointer& call, const std::vector<change::NamedChange>& named,
               const ChangeQuestion& question, const MayChange& next) {
    call->withCaller([call, named, question, next](const Caller& caller) {
        submit(call, call->parts().lookups, caller, [call, caller, named, question, next] {
            AgentHost host(call->parts().agent);
            try {
                const std::vector<change::MeantChange> changes = change::meantChanges(host, named);
                comeBack(call, [call, caller, question, changes, next] {
                    askWhetherAllowed(call, caller, question, changes, next);
                });
            } catch (const change::BadChangeFile& twice) {
                throw Problem(Problem::refused, twice.what());
            }
        });
    });
}

std::vector<Reading> AgentHost::read(const NodeRef& node, const std::vector<std::string>& properties,
                                     const Request& request) {
    return agent_.read(node, readableIds(*node, properties), Freshness::anew, request);
}

WriteResult AgentHost::write(const NodeRef& node, const Property& row, const std::vector<std::string>& words,
                             const Request& request) {
    try {
        return agent_.write(node, row, acceptedValue(row, words), request);
    } catch (const Problem& problem) {
        WriteResult result;
        result.after.id = row.id;
        result.after.row = &row;
        result.after.error = problem.what();
        result.problem = problem;
        return result;
    }
}

void AgentHost::showErrors(const Request& request) {
    for (std::string& error : request.errors().take().texts) {
        errors_.push_back(std::move(error));
    }
}

}  // namespace cvagent::service
