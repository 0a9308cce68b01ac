#include "agent/cli/remote/service.h"

#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <string>
#include <utility>
#include <vector>

#include "agent/bus/reader.h"
#include "agent/bus/writer.h"
#include "agent/cli/print.h"
#include "agent/cli/remote/remote_session.h"
#include "agent/core/text.h"

namespace cvagent::remote {

namespace {

constexpr const char* kBusVariable = "CORVISTA_BUS";
constexpr std::uint64_t kMicroseconds = 1000000;

/// Where cvagentd --private-bus has its own, on hosts without a system bus.
constexpr const char* kPrivateBus = "unix:path=/run/corvista/bus";

/// Where it has his, when a user has started it; "" for nowhere. No runtime directory has a name that would
/// have to be escaped.
std::string ownBus() {
    constexpr const char* kPlain = "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789-_/.";
    const char* runtime = std::getenv("XDG_RUNTIME_DIR");
    const std::string place = runtime != nullptr && geteuid() != 0 ? runtime : "";
    const bool isPlain = place.starts_with('/') && place.find_first_not_of(kPlain) == std::string::npos;
    return isPlain ? "unix:path=" + place + "/corvista/bus" : "";
}

/// In the order in which they are asked.
std::vector<std::string> addressesOf(const Options& options) {
    const char* named = std::getenv(kBusVariable);
    const std::string address = options.bus ? *options.bus : named != nullptr ? named : "";
    if (address == "none") {
        return {};
    }
    if (!address.empty()) {
        return {address};
    }
    std::vector<std::string> addresses{"system", kPrivateBus};
    if (std::string own = ownBus(); !own.empty()) {
        addresses.push_back(std::move(own));
    }
    return addresses;
}

struct Reached {
    std::unique_ptr<Client> client;
    std::string address;
    std::string why;  ///< there is no client; "" for nothing to tell
};

/// What a command begins with.
Question firstQuestion(const Options& options) {
    return options.command == Command::tree  ? Question{"Tree"}
           : options.command == Command::get ? questionOf(options.node, options.properties)
           : options.command == Command::set ? Question{"Find", options.node}
                                             : Question();
}

Reached reach(const Options& options, const Question& first = {}) {
    Reached reached;
    bool silent = !options.bus;
    for (const std::string& address : addressesOf(options)) {
        try {
            reached.client = std::make_unique<Client>(address, -1, first);
            reached.address = address;
            return reached;
        } catch (const NoService& none) {
            silent = silent && none.isSilent();
            reached.why = reached.why.empty() || !none.isSilent() ? none.what() : reached.why;
        }
    }
    reached.why = silent ? "" : reached.why;
    return reached;
}

std::string timeOf(std::uint64_t microseconds) {
    return timeText(static_cast<std::time_t>(microseconds / kMicroseconds));
}

/// The answer to a call about a change, for which the service may ask a person. Throws what an error stands
/// for.
bus::Message askAboutChange(Client& client, const bus::Message& call) {
    bus::Message asked = call;
    if (isatty(STDIN_FILENO) == 1) {
        asked.allowInteraction();
    }
    return client.askForLong(asked);
}

}  // namespace

std::unique_ptr<Session> openSession(const Options& options, bool silent) {
    if (options.byItself) {
        return nullptr;
    }
    Reached reached = reach(options, firstQuestion(options));
    if (reached.client) {
        return std::make_unique<RemoteSession>(std::move(reached.client), reached.address,
                                               isatty(STDIN_FILENO) == 1);
    }
    if (!silent && !reached.why.empty()) {
        complain(reached.why + "; cvagent works by itself");
    }
    return nullptr;
}

ServiceReport describeService(const Options& options) {
    ServiceReport report;
    try {
        const Reached reached = reach(options);
        if (!reached.client) {
            report.problem = reached.why.empty() ? "not running: cvagent works by itself" : reached.why;
            return report;
        }
        Client& client = *reached.client;
        report.version = client.textProperty("Version");
        report.since = timeOf(client.numberProperty("StartedAt"));
        report.looked = timeOf(client.numberProperty("LookedAt"));
        report.consent = client.textProperty("Consent");
    } catch (const std::runtime_error& error) {  // Failure, ServiceGone, Problem
        report.problem = error.what();
        report.problem.erase(std::min(report.problem.find('\n'), report.problem.size()));  // advice
    }
    return report;
}

bool confirmChange(const Options& options, unsigned number) {
    const Reached reached = reach(options);
    if (!reached.client) {
        return false;
    }
    const bus::Message call = reached.client->call(options.confirmSeconds ? "Lengthen" : "Confirm");
    bus::Writer writer(call);
    writer.put(std::uint32_t{number});
    if (options.confirmSeconds) {
        writer.put(*options.confirmSeconds);
    }
    askAboutChange(*reached.client, call);
    return true;
}

std::optional<RolledBack> rollBack(const Options& options, unsigned number) {
    const Reached reached = reach(options);
    if (!reached.client) {
        return std::nullopt;
    }
    const bus::Message call = reached.client->call("Rollback");
    bus::Writer(call).put(std::uint32_t{number});
    const bus::Message answer = askAboutChange(*reached.client, call);
    RolledBack back;
    reached.client->read(answer, [&back](bus::Reader& reader) {
        back.number = reader.number();
        back.stage = reader.text();
        back.notes = reader.texts();
    });
    return back;
}

}  // namespace cvagent::remote
