#include "hosttools/ethtool_words.h"

#include <linux/ethtool.h>
#include <array>
#include <limits>
#include <span>

namespace hosttools {
namespace {

using Words = std::span<const std::string_view>;

struct Named {
    unsigned number;
    std::string_view name;
};

constexpr Named ports[] = {
    {PORT_TP, "Twisted Pair"}, {PORT_AUI, "AUI"},     {PORT_MII, "MII"},
    {PORT_FIBRE, "FIBRE"},     {PORT_BNC, "BNC"},     {PORT_DA, "Direct Attach Copper"},
    {PORT_NONE, "None"},       {PORT_OTHER, "Other"},
};
constexpr Named duplexes[] = {{DUPLEX_HALF, "Half"}, {DUPLEX_FULL, "Full"}};
constexpr Named transceivers[] = {{XCVR_INTERNAL, "internal"}, {XCVR_EXTERNAL, "external"}};
constexpr Named masterSlaveConfigurations[] = {
    {MASTER_SLAVE_CFG_UNKNOWN, "unknown"},
    {MASTER_SLAVE_CFG_MASTER_PREFERRED, "preferred master"},
    {MASTER_SLAVE_CFG_SLAVE_PREFERRED, "preferred slave"},
    {MASTER_SLAVE_CFG_MASTER_FORCE, "forced master"},
    {MASTER_SLAVE_CFG_SLAVE_FORCE, "forced slave"},
};
constexpr Named masterSlaveStates[] = {
    {MASTER_SLAVE_STATE_UNKNOWN, "unknown"},
    {MASTER_SLAVE_STATE_MASTER, "master"},
    {MASTER_SLAVE_STATE_SLAVE, "slave"},
    {MASTER_SLAVE_STATE_ERR, "resolution error"},
};

constexpr std::string_view noLinkReasons[] = {
    "Autoneg",     "Link training failure", "Logical mismatch",    "Bad signal integrity",  "No cable",
    "Cable issue", "EEPROM issue",          "Calibration failure", "Power budget exceeded", "Overheat",
    "Module",
};

// Details count from 1.
constexpr std::string_view negotiationDetails[] = {
    "No partner detected",          "Ack not received",
    "Next page exchange failed",    "No partner detected during force mode",
    "FEC mismatch during override", "No HCD",
};
constexpr std::string_view trainingDetails[] = {
    "KR frame lock not acquired",
    "KR link inhibit timeout",
    "KR Link partner did not set receiver ready",
    "Remote side is not ready yet",
};
constexpr std::string_view mismatchDetails[] = {
    "PCS did not acquire block lock", "PCS did not acquire AM lock", "PCS did not get align_status",
    "FC FEC is not locked",           "RS FEC is not locked",
};
constexpr std::string_view signalDetails[] = {
    "Large number of physical errors",
    "Unsupported rate",
    "Serdes reference clock lost",
    "Serdes ALOS",
};
constexpr std::string_view cableDetails[] = {"Unsupported cable", "Cable test failure"};
constexpr std::string_view moduleDetails[] = {"CMIS module is not in ModuleReady state"};

constexpr struct {
    unsigned reason;
    Words details;
} detailsOfReasons[] = {
    {ETHTOOL_LINK_EXT_STATE_AUTONEG, negotiationDetails},
    {ETHTOOL_LINK_EXT_STATE_LINK_TRAINING_FAILURE, trainingDetails},
    {ETHTOOL_LINK_EXT_STATE_LINK_LOGICAL_MISMATCH, mismatchDetails},
    {ETHTOOL_LINK_EXT_STATE_BAD_SIGNAL_INTEGRITY, signalDetails},
    {ETHTOOL_LINK_EXT_STATE_CABLE_ISSUE, cableDetails},
    {ETHTOOL_LINK_EXT_STATE_MODULE, moduleDetails},
};

constexpr std::string_view messageClasses[] = {
    "drv",       "probe", "link",    "timer",     "ifdown",  "ifup", "rx_err", "tx_err",
    "tx_queued", "intr",  "tx_done", "rx_status", "pktdata", "hw",   "wol",
};

/// In the order of their bits.
constexpr std::string_view wakeLetters = "pumbagsf";

void addNamed(Text& text, std::span<const Named> names, unsigned number) {
    for (const Named& named : names) {
        if (named.number == number) {
            text.add(named.name);
            return;
        }
    }
    text.add("Unknown! (").number(number).add(")");
}

std::string_view wordAt(Words words, unsigned position) {
    return position < words.size() ? words[position] : std::string_view();
}

void addWakeLetters(Text& text, std::uint32_t modes) {
    if (modes == 0) text.add('d');
    for (std::size_t bit = 0; bit < wakeLetters.size(); ++bit) {
        if ((modes >> bit & 1U) != 0) text.add(wakeLetters[bit]);
    }
}

}  // namespace

void addPort(Text& text, unsigned port) {
    addNamed(text, ports, port);
}

void addDuplex(Text& text, unsigned duplex) {
    addNamed(text, duplexes, duplex);
}

void addTransceiver(Text& text, unsigned transceiver) {
    addNamed(text, transceivers, transceiver);
}

void addMasterSlaveConfiguration(Text& text, unsigned configuration) {
    addNamed(text, masterSlaveConfigurations, configuration);
}

void addMasterSlaveState(Text& text, unsigned state) {
    addNamed(text, masterSlaveStates, state);
}

void addSpeed(Text& text, std::uint32_t speed) {
    // Drivers write "unknown" as 0 or as all ones, of 16 or of 32 bits.
    constexpr std::uint32_t unknowns[] = {0, std::numeric_limits<std::uint16_t>::max(),
                                          std::numeric_limits<std::uint32_t>::max()};
    for (const std::uint32_t unknown : unknowns) {
        if (speed == unknown) {
            text.add("Unknown!");
            return;
        }
    }
    text.number(speed).add("Mb/s");
}

void addCrossover(Text& text, unsigned now, unsigned wanted) {
    if (wanted == ETH_TP_MDI || wanted == ETH_TP_MDI_X) {
        text.add(wanted == ETH_TP_MDI ? "off (forced)" : "on (forced)");
        return;
    }
    text.add(now == ETH_TP_MDI ? "off" : now == ETH_TP_MDI_X ? "on" : "Unknown");
    if (wanted == ETH_TP_MDI_AUTO) text.add(" (auto)");
}

void addWakeOnLan(Text& text, std::uint32_t supported, std::uint32_t enabled) {
    text.add("\tSupports Wake-on: ");
    addWakeLetters(text, supported);
    text.add("\n\tWake-on: ");
    addWakeLetters(text, enabled);
    text.add('\n');
}

void addPassword(Text& text, std::string_view password) {
    text.add("        SecureOn password: ");
    const char* before = "";
    for (const char byte : password) {
        text.add(before).hex(static_cast<unsigned char>(byte), 2);
        before = ":";
    }
    text.add('\n');
}

void addPause(Text& text, bool pause, bool asymmetric) {
    if (pause) {
        text.add(asymmetric ? "Symmetric Receive-only" : "Symmetric");
    } else {
        text.add(asymmetric ? "Transmit-only" : "No");
    }
}

std::string_view noLinkReason(unsigned reason) {
    return wordAt(noLinkReasons, reason);
}

std::string_view noLinkDetail(unsigned reason, unsigned detail) {
    for (const auto& [of, details] : detailsOfReasons) {
        if (of == reason) return wordAt(details, detail - 1);
    }
    return {};
}

std::string_view messageClass(unsigned bit) {
    return wordAt(messageClasses, bit);
}

}  // namespace hosttools
