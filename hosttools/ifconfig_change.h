#pragma once

#include "hosttools/applet.h"

namespace hosttools {

/// Carries out the words behind an interface's name one after the other, with the calls of the classic tool
/// in its order: `up`, `down`, an address (which also brings the interface up), `netmask MASK`, `broadcast
/// ADDRESS`, `pointopoint ADDRESS`. The first that fails ends it, with the classic message on standard error.
/// Addresses are numeric ("default" is 0.0.0.0): no name is looked up. Nothing is done of a call with any
/// other word, which is left to the host's own tool, or with the same word twice.
/// @return the exit status
int changeInterface(const char* interface, Arguments words, Answer& answer);

}  // namespace hosttools
