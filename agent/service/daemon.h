#pragma once

#include "agent/service/options.h"

namespace cvagent::service {

enum class ExitStatus { done = 0, failed = 1, usage = 2, busy = 5 };

/// The whole run of the service, from the preparation of the process to its end; a signal ends it by that
/// signal. Throws Problem and bus::Error when it cannot begin.
ExitStatus runDaemon(Options& options);

}  // namespace cvagent::service
