#include "agent/verify/link_modes.h"

#include <linux/ethtool.h>

#include <algorithm>
#include <iterator>

namespace cvagent::verify {

namespace {

constexpr unsigned kMostBits = 32 * 127;

constexpr LinkMode kModes[] = {
    {ETHTOOL_LINK_MODE_10baseT_Half_BIT, 10, 50},
    {ETHTOOL_LINK_MODE_10baseT_Full_BIT, 10, 50},
    {ETHTOOL_LINK_MODE_100baseT_Half_BIT, 100, 52},
    {ETHTOOL_LINK_MODE_100baseT_Full_BIT, 100, 52},
    {ETHTOOL_LINK_MODE_1000baseT_Half_BIT, 1000, 53},
    {ETHTOOL_LINK_MODE_1000baseT_Full_BIT, 1000, 53},
    {ETHTOOL_LINK_MODE_10000baseT_Full_BIT, 10000, 0},
    {ETHTOOL_LINK_MODE_2500baseT_Full_BIT, 2500, 54},
    {ETHTOOL_LINK_MODE_5000baseT_Full_BIT, 5000, 0},
    {ETHTOOL_LINK_MODE_100baseT1_Full_BIT, 100, 0},
    {ETHTOOL_LINK_MODE_1000baseT1_Full_BIT, 1000, 0},
    {ETHTOOL_LINK_MODE_10baseT1L_Full_BIT, 10, 0},
    {99, 10, 0},   // 10baseT1S/Full; these three are not among the C library's
    {100, 10, 0},  // 10baseT1S/Half
    {101, 10, 0},  // 10baseT1S_P2MP/Half
};

// What the kernel keeps among the modes: negotiation, ports, pause, error correction.
constexpr unsigned kNoModes[] = {
    ETHTOOL_LINK_MODE_Autoneg_BIT,  ETHTOOL_LINK_MODE_TP_BIT,         ETHTOOL_LINK_MODE_AUI_BIT,
    ETHTOOL_LINK_MODE_MII_BIT,      ETHTOOL_LINK_MODE_FIBRE_BIT,      ETHTOOL_LINK_MODE_BNC_BIT,
    ETHTOOL_LINK_MODE_Pause_BIT,    ETHTOOL_LINK_MODE_Asym_Pause_BIT, ETHTOOL_LINK_MODE_Backplane_BIT,
    ETHTOOL_LINK_MODE_FEC_NONE_BIT, ETHTOOL_LINK_MODE_FEC_RS_BIT,     ETHTOOL_LINK_MODE_FEC_BASER_BIT,
    ETHTOOL_LINK_MODE_FEC_LLRS_BIT,
};

}  // namespace

LinkMode firstLinkMode(const std::function<bool(unsigned)>& isSupported) {
    for (unsigned bit = 0; bit < kMostBits; ++bit) {
        if (std::ranges::find(kNoModes, bit) == std::end(kNoModes) && isSupported(bit)) {
            const auto* known = std::ranges::find(kModes, bit, &LinkMode::bit);
            return known != std::end(kModes) ? *known : LinkMode{bit};
        }
    }
    return {};
}

}  // namespace cvagent::verify
