#pragma once

namespace IC::LinkState {

// What an interface's state is in the state maps, the state file and property 123.
constexpr unsigned int up = 1;
constexpr unsigned int down = 12;
constexpr unsigned int switchedOver = 32;  ///< a member of the bond has gone down since the last pass
constexpr unsigned int switchedBack = 33;  ///< a member of the bond has come back since the last pass
constexpr unsigned int noVerdict = 34;     ///< the bond's members tell of no fail-over

// Properties the states are read from.
constexpr unsigned int nameProperty = 108;
constexpr unsigned int stateProperty = 123;

}  // namespace IC::LinkState
