// In place of the other files here where the program is built without the service.
#include "agent/cli/print.h"
#include "agent/cli/remote/service.h"

namespace cvagent::remote {

namespace {

constexpr const char* kNone = "this cvagent was built without the service";

}  // namespace

std::unique_ptr<Session> openSession(const Options& options, bool silent) {
    if (!silent && options.bus && *options.bus != "none") {
        complain(std::string(kNone) + " and works by itself");
    }
    return nullptr;
}

ServiceReport describeService(const Options& /*options*/) {
    ServiceReport report;
    report.problem = kNone;
    return report;
}

bool confirmChange(const Options& /*options*/, unsigned /*number*/) {
    return false;
}

std::optional<RolledBack> rollBack(const Options& /*options*/, unsigned /*number*/) {
    return std::nullopt;
}

}  // namespace cvagent::remote
