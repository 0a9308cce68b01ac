#pragma once

#include "framework/ic/link_state.h"

namespace IC::LinkState {

constexpr unsigned int noVerdict = 34;  ///< the bond's members tell of no fail-over

// Properties the states are read from.
constexpr unsigned int nameProperty = 108;
constexpr unsigned int stateProperty = 123;

}  // namespace IC::LinkState
