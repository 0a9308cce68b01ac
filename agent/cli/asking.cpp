#include "agent/cli/asking.h"

#include <chrono>
#include <string>
#include <thread>

#include "agent/cli/print.h"
#include "agent/cli/remote/service.h"
#include "agent/core/signals.h"

namespace cvagent {

namespace {

constexpr int kAttempts = 10;  // to ask a service that has ended
constexpr std::chrono::milliseconds kBetweenAttempts{100};

bool onlyReads(const Options& options) {
    return options.command != Command::watch && options.command != Command::set &&
           options.command != Command::apply;
}

}  // namespace

std::optional<ExitStatus> askService(Question ask, Options& options, Preparation prepare) {
    std::string gone;
    for (int attempt = 0; attempt < kAttempts; ++attempt) {
        try {
            if (const auto service = remote::openSession(options, prepare == nullptr || attempt > 0)) {
                options.byService = true;
                if (prepare != nullptr) {
                    prepare(options);
                }
                if (!onlyReads(options)) {
                    StopSignals::install();
                }
                return ask(*service, options);
            }
        } catch (const remote::ServiceGone& ended) {
            gone = ended.what();
            if (!onlyReads(options)) {
                throw Failure(ExitStatus::failed, gone + "; nothing was done");
            }
        }
        options.byService = false;
        if (gone.empty()) {
            return std::nullopt;
        }
        std::this_thread::sleep_for(kBetweenAttempts);
    }
    complain(gone + "; cvagent looks by itself");
    return std::nullopt;
}

}  // namespace cvagent
