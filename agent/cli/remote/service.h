#pragma once

#include <memory>
#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

#include "agent/cli/options.h"
#include "agent/cli/session.h"

/// The service as the command line finds it. Where it was built without, there is none.
namespace cvagent::remote {

/// It has ended while it was asked. Whoever only reads can ask the host himself.
class ServiceGone : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// A session with the service; null when the command is worked by this process: by the options, or since no
/// service runs that could be believed, which is told where somebody has named a bus. Throws Failure of one
/// that does not answer.
/// @param silent nothing is told
std::unique_ptr<Session> openSession(const Options& options, bool silent = false);

struct ServiceReport {
    std::string problem;  ///< why there is none; the rest is empty then
    std::string version;
    std::string since;   ///< when it was ready: "2026-11-20T21:03:00Z"
    std::string looked;  ///< when it last looked at everything
    std::string consent;
};
/// What a service says of itself.
ServiceReport describeService(const Options& options);

struct RolledBack {
    unsigned number = 0;
    std::string stage;  ///< see undo::stageText
    std::vector<std::string> notes;
};
// What becomes of changes that were made, for who may not do it by himself. Throw Failure, Problem and
// ServiceGone.

/// Keeps a change, or gives it the options' time. @return false: there is no service
bool confirmChange(const Options& options, unsigned number);
/// @param number 0: the last one
/// @return nothing: there is no service
std::optional<RolledBack> rollBack(const Options& options, unsigned number);

}  // namespace cvagent::remote
