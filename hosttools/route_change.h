#pragma once

#include "hosttools/applet.h"

namespace hosttools {

/// `add|del -host A|-net A netmask M|default [gw G] [metric N] [[dev] INTERFACE]`, with the call of the
/// classic tool. Messages of failures as it words them on standard error. Addresses are numeric.
/// @return the exit status
int changeRoute(Arguments words, Answer& answer);

}  // namespace hosttools
