#pragma once

#include "hosttools/applet.h"

namespace hosttools {

/// Runs the host's own tool in the place of this program, with the same words and streams: the first on PATH
/// that is not this program; for `egrep`, where there is none, `grep -E`. Directories of PATH that are not
/// absolute are passed over. Returns where there is no such tool, or where another copy of this program has
/// handed the call over already.
void becomeHostTool(const char* name, Arguments words);

}  // namespace hosttools
