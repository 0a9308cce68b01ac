#include "hosttools/ethtool_listing.h"

#include <linux/ethtool.h>
#include <linux/ethtool_netlink.h>
#include <algorithm>
#include <map>
#include <optional>
#include <vector>

#include "hosttools/ethtool_words.h"
#include "hosttools/netlink.h"

namespace hosttools {
namespace {

/// What attributes say, by their numbers.
class Attributes {
public:
    explicit Attributes(std::string_view bytes) {
        eachAttribute(bytes, [this](unsigned type, std::string_view data) { found_[type] = data; });
    }

    std::optional<std::string_view> bytes(unsigned type) const {
        const auto found = found_.find(type);
        return found != found_.end() ? std::optional(found->second) : std::nullopt;
    }
    std::optional<std::uint32_t> number(unsigned type) const {
        const auto data = bytes(type);
        return data ? std::optional(readPadded<std::uint32_t>(*data)) : std::nullopt;
    }
    std::string text(unsigned type) const {
        const std::string_view data = bytes(type).value_or("");
        return std::string(data.substr(0, data.find('\0')));
    }

private:
    std::map<unsigned, std::string_view> found_;
};

struct Bit {
    unsigned index = 0;
    std::string name;
    bool on = false;
};

/// The bits that a bitset lists, each with its name: those of its mask, or without one those that are on.
std::vector<Bit> readBits(std::string_view bitset) {
    const Attributes set(bitset);
    const bool noMask = set.bytes(ETHTOOL_A_BITSET_NOMASK).has_value();
    std::vector<Bit> bits;
    eachAttribute(set.bytes(ETHTOOL_A_BITSET_BITS).value_or(""), [&](unsigned, std::string_view data) {
        const Attributes bit(data);
        bits.push_back({bit.number(ETHTOOL_A_BITSET_BIT_INDEX).value_or(0),
                        bit.text(ETHTOOL_A_BITSET_BIT_NAME),
                        noMask || bit.bytes(ETHTOOL_A_BITSET_BIT_VALUE).has_value()});
    });
    return bits;
}

std::uint32_t numberOf(const std::vector<Bit>& bits, bool onlyThoseOn) {
    std::uint32_t number = 0;
    for (const Bit& bit : bits) {
        if (bit.index < 32 && (bit.on || !onlyThoseOn)) number |= 1U << bit.index;
    }
    return number;
}

enum class ModeClass { speed, port, fec, other };

/// The kernel keeps more than speeds in the same set.
ModeClass classOf(unsigned bit) {
    switch (bit) {
        case ETHTOOL_LINK_MODE_TP_BIT:
        case ETHTOOL_LINK_MODE_AUI_BIT:
        case ETHTOOL_LINK_MODE_MII_BIT:
        case ETHTOOL_LINK_MODE_FIBRE_BIT:
        case ETHTOOL_LINK_MODE_BNC_BIT:
        case ETHTOOL_LINK_MODE_Backplane_BIT:
            return ModeClass::port;
        case ETHTOOL_LINK_MODE_FEC_NONE_BIT:
        case ETHTOOL_LINK_MODE_FEC_RS_BIT:
        case ETHTOOL_LINK_MODE_FEC_BASER_BIT:
        case ETHTOOL_LINK_MODE_FEC_LLRS_BIT:
            return ModeClass::fec;
        case ETHTOOL_LINK_MODE_Autoneg_BIT:
        case ETHTOOL_LINK_MODE_Pause_BIT:
        case ETHTOOL_LINK_MODE_Asym_Pause_BIT:
            return ModeClass::other;
        default:
            return ModeClass::speed;
    }
}

/// One side's link modes: what it can do, what it offers, or what the other end offers.
class Modes {
public:
    Modes(const std::vector<Bit>& bits, bool onlyThoseOn) {
        std::ranges::copy_if(bits, std::back_inserter(bits_),
                             [=](const Bit& bit) { return bit.on || !onlyThoseOn; });
    }

    void addPorts(Text& text) const {
        text.add("\tSupported ports: [ ");
        addNames(text, ModeClass::port, "");
        text.add(" ]\n");
    }
    void addSpeeds(Text& text, std::size_t indent) const {
        const Bit* before = nullptr;
        for (const Bit& bit : bits_) {
            if (classOf(bit.index) != ModeClass::speed) continue;
            if (before != nullptr) addBetween(text, *before, bit, indent);
            text.add(bit.name);
            before = &bit;
        }
        text.add(before == nullptr ? "Not reported\n" : "\n");
    }
    void addErrorCorrections(Text& text) const { addNames(text, ModeClass::fec, "Not reported"); }
    bool has(unsigned index) const { return std::ranges::find(bits_, index, &Bit::index) != bits_.end(); }

private:
    /// Half and full duplex of a speed share a line, but for the newest, which the tool does not know either.
    static void addBetween(Text& text, const Bit& before, const Bit& bit, std::size_t indent) {
        constexpr unsigned newestKnown = ETHTOOL_LINK_MODE_10baseT1L_Full_BIT;
        if (bit.index == before.index + 1 && bit.index <= newestKnown && before.name.ends_with("/Half")) {
            text.add(' ');
        } else {
            text.add("\n\t").left("", indent);
        }
    }
    void addNames(Text& text, ModeClass wanted, std::string_view none) const {
        bool first = true;
        for (const Bit& bit : bits_) {
            if (classOf(bit.index) != wanted) continue;
            text.add(first ? "" : "\t ").add(bit.name);
            first = false;
        }
        if (first) text.add(none);
    }

    std::vector<Bit> bits_;
};

void addOurModes(Text& text, std::string_view bitset) {
    const std::vector<Bit> bits = readBits(bitset);
    const Modes supported(bits, false);
    supported.addPorts(text);
    addModes(text, supported, supportedModes);
    addModes(text, Modes(bits, true), advertisedModes);
}

/// "\tLABEL: " and a number's name, when the number is there.
void addNamedNumber(Text& text, std::string_view label, std::optional<std::uint32_t> number,
                    void (*addName)(Text&, unsigned)) {
    if (!number) return;
    text.add("\t").add(label).add(": ");
    addName(text, *number);
    text.add('\n');
}

void addLinkModes(Text& text, const Attributes& told) {
    if (const auto ours = told.bytes(ETHTOOL_A_LINKMODES_OURS)) addOurModes(text, *ours);
    if (const auto peer = told.bytes(ETHTOOL_A_LINKMODES_PEER)) {
        addModes(text, Modes(readBits(*peer), true), partnerModes);
    }
    addNamedNumber(text, "Speed", told.number(ETHTOOL_A_LINKMODES_SPEED), addSpeed);
    addNamedNumber(text, "Lanes", told.number(ETHTOOL_A_LINKMODES_LANES),
                   [](Text& place, unsigned lanes) { place.number(lanes); });
    addNamedNumber(text, "Duplex", told.number(ETHTOOL_A_LINKMODES_DUPLEX), addDuplex);
    addNamedNumber(text, "Auto-negotiation", told.number(ETHTOOL_A_LINKMODES_AUTONEG),
                   [](Text& place, unsigned on) { place.add(on == AUTONEG_DISABLE ? "off" : "on"); });
    addNamedNumber(text, "master-slave cfg", told.number(ETHTOOL_A_LINKMODES_MASTER_SLAVE_CFG),
                   addMasterSlaveConfiguration);
    addNamedNumber(text, "master-slave status", told.number(ETHTOOL_A_LINKMODES_MASTER_SLAVE_STATE),
                   addMasterSlaveState);
}

void addLinkInfo(Text& text, const Attributes& told) {
    const auto port = told.number(ETHTOOL_A_LINKINFO_PORT);
    addNamedNumber(text, "Port", port, addPort);
    addNamedNumber(text, "PHYAD", told.number(ETHTOOL_A_LINKINFO_PHYADDR),
                   [](Text& place, unsigned address) { place.number(address); });
    addNamedNumber(text, "Transceiver", told.number(ETHTOOL_A_LINKINFO_TRANSCEIVER), addTransceiver);
    const auto now = told.number(ETHTOOL_A_LINKINFO_TP_MDIX);
    const auto wanted = told.number(ETHTOOL_A_LINKINFO_TP_MDIX_CTRL);
    if (port != PORT_TP || !now || !wanted) return;
    text.add("\tMDI-X: ");
    addCrossover(text, *now, *wanted);
    text.add('\n');
}

void addWakeUp(Text& text, const Attributes& told) {
    const std::vector<Bit> bits = readBits(told.bytes(ETHTOOL_A_WOL_MODES).value_or(""));
    addWakeOnLan(text, numberOf(bits, false), numberOf(bits, true));
    if (const auto password = told.bytes(ETHTOOL_A_WOL_SOPASS)) addPassword(text, *password);
}

void addMessageLevel(Text& text, const Attributes& told) {
    const auto bitset = told.bytes(ETHTOOL_A_DEBUG_MSGMASK);
    if (!bitset) return;
    const std::vector<Bit> bits = readBits(*bitset);
    const std::uint32_t level = numberOf(bits, true);
    text.add("        Current message level: 0x").hex(level, 8).add(" (").number(level).add(")\n");
    text.left("", 30);
    for (const Bit& bit : bits) {
        if (bit.on) text.add(' ').add(bit.name);
    }
    text.add('\n');
}

void addWordOrNumber(Text& text, std::string_view word, unsigned number) {
    if (word.empty()) {
        text.number(number);
    } else {
        text.add(word);
    }
}

void addReason(Text& text, const Attributes& told) {
    const auto reason = told.number(ETHTOOL_A_LINKSTATE_EXT_STATE);
    if (!reason) return;
    addWordOrNumber(text.add(" ("), noLinkReason(*reason), *reason);
    if (const auto detail = told.number(ETHTOOL_A_LINKSTATE_EXT_SUBSTATE)) {
        addWordOrNumber(text.add(", "), noLinkDetail(*reason, *detail), *detail);
    }
    text.add(")");
}

void addLinkState(Text& text, const Attributes& told) {
    if (const auto link = told.number(ETHTOOL_A_LINKSTATE_LINK)) {
        text.add("\tLink detected: ").add(*link != 0 ? "yes" : "no");
        addReason(text, told);
        text.add('\n');
    }
    if (const auto quality = told.number(ETHTOOL_A_LINKSTATE_SQI)) {
        text.add("\tSQI: ").number(*quality);
        if (const auto most = told.number(ETHTOOL_A_LINKSTATE_SQI_MAX)) text.add("/").number(*most);
        text.add('\n');
    }
}

constexpr std::array<void (*)(Text&, const Attributes&), linkQuestions> sections = {
    addLinkModes, addLinkInfo, addWakeUp, addMessageLevel, addLinkState};

/// The name by which the kernel knows it, which need not be the one that it was asked for by.
std::string nameOf(const Attributes& told) {
    constexpr unsigned header = ETHTOOL_A_LINKMODES_HEADER;  // the same in all answers
    return Attributes(told.bytes(header).value_or("")).text(ETHTOOL_A_HEADER_DEV_NAME);
}

}  // namespace

Text listLink(const LinkReplies& replies) {
    Text text;
    for (std::size_t number = 0; number < replies.size(); ++number) {
        if (replies[number].error != 0) continue;
        const Attributes told(replies[number].attributes);
        Text section;
        sections[number](section, told);
        if (section.size() == 0) continue;
        if (text.size() == 0) text.add("Settings for ").add(nameOf(told)).add(":\n");
        text.add(section);
    }
    return text;
}

}  // namespace hosttools
