#pragma once

#include <functional>

namespace cvagent::verify {

/// What the plug-in tells of a network card by the first of its link modes.
struct LinkMode {
    unsigned bit = 0;       ///< ETHTOOL_LINK_MODE_..._BIT
    unsigned megabits = 0;  ///< 0 for one whose name is not "<megabits>baseT..."
    unsigned portType = 0;  ///< 0 for one that has no code
};

/// The first of those that a card supports; zeros when it supports none.
LinkMode firstLinkMode(const std::function<bool(unsigned bit)>& isSupported);

}  // namespace cvagent::verify
