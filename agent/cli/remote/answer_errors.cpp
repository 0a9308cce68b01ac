#include "agent/cli/remote/answer_errors.h"

#include <algorithm>
#include <array>
#include <iterator>

#include "agent/bus/reader.h"
#include "agent/cli/failure.h"
#include "agent/cli/remote/service.h"
#include "agent/service/names.h"

namespace cvagent::remote {

namespace {

struct KindName {
    const char* name;
    Problem::Kind kind;
};

constexpr KindName kKinds[] = {{"NotFound", Problem::notFound}, {"Ambiguous", Problem::ambiguous},
                               {"Refused", Problem::refused},   {"Busy", Problem::busy},
                               {"TimedOut", Problem::timedOut}, {"Failed", Problem::failed}};

constexpr std::array kUnknown = {bus::kUnknownMethod, bus::kUnknownObject, bus::kUnknownInterface,
                                 bus::kUnknownProperty, bus::kInvalidArgs};
constexpr std::array kGone = {"org.freedesktop.DBus.Error.NoReply", bus::kServiceUnknown,
                              bus::kNameHasNoOwner, "org.freedesktop.DBus.Error.Disconnected"};

Problem::Subject subjectOf(const std::string& name) {
    return name == "node"       ? Problem::node
           : name == "property" ? Problem::property
           : name == "plan"     ? Problem::plan
           : name == "force"    ? Problem::objection
                                : Problem::none;
}

}  // namespace

Problem::Kind kindNamed(const std::string& name) {
    const auto row =
        std::ranges::find_if(kKinds, [&name](const KindName& kind) { return name == kind.name; });
    return row == std::end(kKinds) ? Problem::failed : row->kind;
}

namespace {

/// What stands behind the message; a service that has nothing more to say leaves it out.
[[noreturn]] void throwProblem(const bus::Message& answer, Problem::Kind kind) {
    const std::string text = answer.error().what();
    if (answer.signature() != "sssas") {
        throw ServiceProblem(Problem(kind, text), {});
    }
    bus::Reader reader(answer);
    reader.skip();
    const Problem::Subject subject = subjectOf(reader.text());
    const std::string detail = reader.text();
    throw ServiceProblem(Problem(kind, text, subject, detail), reader.texts());
}

bool isOneOf(const auto& names, const std::string& name) {
    return std::ranges::find(names, name) != std::end(names);
}

}  // namespace

bool throwAnswer(const bus::Message& answer) {
    const bus::Error error = answer.error();
    const std::string prefix = service::kErrorPrefix;
    if (error.name().starts_with(prefix)) {
        throwProblem(answer, kindNamed(error.name().substr(prefix.size())));
    }
    if (isOneOf(kUnknown, error.name())) {
        return false;
    }
    const std::string text = error.what();
    if (isOneOf(kGone, error.name())) {
        throw ServiceGone("the service has ended before it answered");
    }
    if (error.name() == bus::kAccessDenied) {
        throw Failure(ExitStatus::refused, "the service does not allow it: " + text);
    }
    if (error.name() == bus::kLimitsExceeded) {
        throw Failure(ExitStatus::busy, "the service has too much to do for you already: " + text);
    }
    throw Failure(ExitStatus::failed, "the service fails: " + text);
}

}  // namespace cvagent::remote
