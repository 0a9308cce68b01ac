#pragma once

#include <linux/ethtool.h>
#include <cstddef>
#include <cstdint>
#include <string_view>

#include "hosttools/text.h"

// What `ethtool` calls what the kernel numbers.

namespace hosttools {

// A number without a name comes as "Unknown! (9)".
void addPort(Text& text, unsigned port);
void addDuplex(Text& text, unsigned duplex);
void addTransceiver(Text& text, unsigned transceiver);
void addMasterSlaveConfiguration(Text& text, unsigned configuration);
void addMasterSlaveState(Text& text, unsigned state);

/// "1000Mb/s"
void addSpeed(Text& text, std::uint32_t speed);
/// How the pairs of a copper cable are crossed, "on (auto)". @param now and @param wanted ETH_TP_MDI...
void addCrossover(Text& text, unsigned now, unsigned wanted);
/// Two lines: which events can wake the host up, and which do.
void addWakeOnLan(Text& text, std::uint32_t supported, std::uint32_t enabled);
/// The line of the password that wakes the host up.
void addPassword(Text& text, std::string_view password);
/// "Symmetric Receive-only"
void addPause(Text& text, bool pause, bool asymmetric);

/// What is said of the link modes of one side.
struct ModeLabels {
    std::string_view whose;       ///< "Supported"
    std::string_view negotiates;  ///< "Supports"
    std::size_t indent;           ///< at which the modes are listed
};
constexpr ModeLabels supportedModes{"Supported", "Supports", 24};
constexpr ModeLabels advertisedModes{"Advertised", "Advertised", 24};
constexpr ModeLabels partnerModes{"Link partner advertised", "Link partner advertised", 37};

/// The modes of one side. @param modes has(bit), addSpeeds(text, indent), addErrorCorrections(text)
template <typename Modes>
void addModes(Text& text, const Modes& modes, const ModeLabels& labels) {
    const std::size_t mark = text.size() + 1;
    text.add("\t").add(labels.whose).add(" link modes:").padLeftAligned(mark, labels.indent);
    modes.addSpeeds(text, labels.indent);
    text.add("\t").add(labels.whose).add(" pause frame use: ");
    addPause(text, modes.has(ETHTOOL_LINK_MODE_Pause_BIT), modes.has(ETHTOOL_LINK_MODE_Asym_Pause_BIT));
    text.add("\n\t").add(labels.negotiates).add(" auto-negotiation: ");
    text.add(modes.has(ETHTOOL_LINK_MODE_Autoneg_BIT) ? "Yes\n\t" : "No\n\t");
    modes.addErrorCorrections(text.add(labels.whose).add(" FEC modes: "));
    text.add('\n');
}

/// Why there is no link, "Autoneg". @return "" for a number without a name
std::string_view noLinkReason(unsigned reason);
/// The reason behind it. Each reason has a list of its own.
std::string_view noLinkDetail(unsigned reason, unsigned detail);
/// A class of a driver's messages, "drv". @return "" for a bit without a name
std::string_view messageClass(unsigned bit);

}  // namespace hosttools
