#include "agent/cli/remote/service.h"

#include <unistd.h>

#include <cstdlib>

#include "agent/cli/print.h"
#include "agent/cli/remote/remote_session.h"
#include "agent/core/signals.h"
#include "agent/core/surroundings.h"
#include "agent/core/text.h"

namespace cvagent::remote {

namespace {

constexpr const char* kBusVariable = "CORVISTA_BUS";
constexpr std::uint64_t kMicroseconds = 1000000;

/// "none" for none.
std::string addressOf(const Options& options) {
    if (options.bus) {
        return *options.bus;
    }
    const char* named = std::getenv(kBusVariable);
    return named != nullptr && *named != '\0' ? named : "system";
}

/// Programs that are run on alerts get the surroundings that those of a local session get.
void prepare(Options& options) {
    if (options.command == Command::watch) {
        prepareSurroundings({&options.program});
    }
    if (options.command == Command::watch || options.command == Command::set) {
        StopSignals::install();
    }
}

std::string timeOf(std::uint64_t microseconds) {
    return timeText(static_cast<std::time_t>(microseconds / kMicroseconds));
}

}  // namespace

std::unique_ptr<Session> openSession(Options& options) {
    const std::string address = addressOf(options);
    if (options.byItself || address == "none") {
        return nullptr;
    }
    try {
        auto client = std::make_unique<Client>(address);
        prepare(options);
        return std::make_unique<RemoteSession>(std::move(client), address, isatty(STDIN_FILENO) == 1);
    } catch (const NoService& none) {
        if (options.bus || !none.isSilent()) {
            complain(std::string(none.what()) + "; cvagent works by itself");
        }
        return nullptr;
    }
}

ServiceReport describeService(const Options& options) {
    ServiceReport report;
    const std::string address = addressOf(options);
    if (address == "none") {
        report.problem = "not asked";
        return report;
    }
    try {
        Client client(address);
        report.version = client.textProperty("Version");
        report.since = timeOf(client.numberProperty("StartedAt"));
        report.looked = timeOf(client.numberProperty("LookedAt"));
        report.consent = client.textProperty("Consent");
    } catch (const std::runtime_error& error) {  // NoService, ServiceGone, Failure, Problem
        report.problem = error.what();
    }
    return report;
}

}  // namespace cvagent::remote
