#include <malloc.h>

#include <exception>
#include <string>

#include "agent/bus/error.h"
#include "agent/core/problem.h"
#include "agent/core/signals.h"
#include "agent/core/surroundings.h"
#include "agent/service/daemon.h"
#include "agent/service/log.h"
#include "agent/service/options.h"

namespace {

using cvagent::service::ExitStatus;
using cvagent::service::log;
using cvagent::service::Priority;

ExitStatus runGuarded(cvagent::service::Options& options) {
    try {
        return cvagent::service::runDaemon(options);
    } catch (const cvagent::Problem& problem) {
        log(Priority::error, problem.what() + problem.detail());
        return problem.kind() == cvagent::Problem::busy ? ExitStatus::busy : ExitStatus::failed;
    } catch (const std::exception& exception) {
        log(Priority::error, exception.what());
        return ExitStatus::failed;
    }
}

/// With a heap for each of its two dozen threads, what one of them has given back is of no use to the others,
/// and the process grows for days.
void shareOneHeap() {
    mallopt(M_ARENA_MAX, 1);
}

}  // namespace

int main(int count, char** words) {
    shareOneHeap();
    cvagent::openStandardDescriptors();
    cvagent::StopSignals::becomeWriteErrors();
    cvagent::service::findJournal();
    try {
        auto options = cvagent::service::parseOptions(count, words);
        return static_cast<int>(options ? runGuarded(*options) : ExitStatus::done);
    } catch (const cvagent::service::UsageError& error) {
        log(Priority::error, error.what());
        return static_cast<int>(ExitStatus::usage);
    }
}
