#include "hosttools/ethtool_calls.h"

#include <linux/ethtool.h>
#include <net/if.h>
#include <cerrno>
#include <cstring>

#include "hosttools/descriptor.h"
#include "hosttools/ethtool_words.h"
#include "hosttools/link_settings.h"

namespace hosttools {
namespace {

struct Named {
    unsigned bit;
    std::string_view name;
};

constexpr Named ports[] = {
    {ETHTOOL_LINK_MODE_TP_BIT, "TP"},       {ETHTOOL_LINK_MODE_AUI_BIT, "AUI"},
    {ETHTOOL_LINK_MODE_BNC_BIT, "BNC"},     {ETHTOOL_LINK_MODE_MII_BIT, "MII"},
    {ETHTOOL_LINK_MODE_FIBRE_BIT, "FIBRE"}, {ETHTOOL_LINK_MODE_Backplane_BIT, "Backplane"},
};

constexpr Named errorCorrections[] = {
    {ETHTOOL_LINK_MODE_FEC_NONE_BIT, "None"},
    {ETHTOOL_LINK_MODE_FEC_BASER_BIT, "BaseR"},
    {ETHTOOL_LINK_MODE_FEC_RS_BIT, "RS"},
    {ETHTOOL_LINK_MODE_FEC_LLRS_BIT, "LLRS"},
};

// As the tool lists them.
constexpr Named speeds[] = {{0, "10baseT/Half"},
                            {1, "10baseT/Full"},
                            {2, "100baseT/Half"},
                            {3, "100baseT/Full"},
                            {4, "1000baseT/Half"},
                            {5, "1000baseT/Full"},
                            {12, "10000baseT/Full"},
                            {15, "2500baseX/Full"},
                            {17, "1000baseKX/Full"},
                            {18, "10000baseKX4/Full"},
                            {19, "10000baseKR/Full"},
                            {20, "10000baseR_FEC"},
                            {21, "20000baseMLD2/Full"},
                            {22, "20000baseKR2/Full"},
                            {23, "40000baseKR4/Full"},
                            {24, "40000baseCR4/Full"},
                            {25, "40000baseSR4/Full"},
                            {26, "40000baseLR4/Full"},
                            {27, "56000baseKR4/Full"},
                            {28, "56000baseCR4/Full"},
                            {29, "56000baseSR4/Full"},
                            {30, "56000baseLR4/Full"},
                            {31, "25000baseCR/Full"},
                            {32, "25000baseKR/Full"},
                            {33, "25000baseSR/Full"},
                            {34, "50000baseCR2/Full"},
                            {35, "50000baseKR2/Full"},
                            {36, "100000baseKR4/Full"},
                            {37, "100000baseSR4/Full"},
                            {38, "100000baseCR4/Full"},
                            {39, "100000baseLR4_ER4/Full"},
                            {40, "50000baseSR2/Full"},
                            {41, "1000baseX/Full"},
                            {42, "10000baseCR/Full"},
                            {43, "10000baseSR/Full"},
                            {44, "10000baseLR/Full"},
                            {45, "10000baseLRM/Full"},
                            {46, "10000baseER/Full"},
                            {47, "2500baseT/Full"},
                            {48, "5000baseT/Full"},
                            {52, "50000baseKR/Full"},
                            {53, "50000baseSR/Full"},
                            {54, "50000baseCR/Full"},
                            {55, "50000baseLR_ER_FR/Full"},
                            {56, "50000baseDR/Full"},
                            {57, "100000baseKR2/Full"},
                            {58, "100000baseSR2/Full"},
                            {59, "100000baseCR2/Full"},
                            {60, "100000baseLR2_ER2_FR2/Full"},
                            {61, "100000baseDR2/Full"},
                            {62, "200000baseKR4/Full"},
                            {63, "200000baseSR4/Full"},
                            {64, "200000baseLR4_ER4_FR4/Full"},
                            {65, "200000baseDR4/Full"},
                            {66, "200000baseCR4/Full"},
                            {67, "100baseT1/Full"},
                            {68, "1000baseT1/Full"},
                            {69, "400000baseKR8/Full"},
                            {70, "400000baseSR8/Full"},
                            {71, "400000baseLR8_ER8_FR8/Full"},
                            {72, "400000baseDR8/Full"},
                            {73, "400000baseCR8/Full"},
                            {75, "100000baseKR/Full"},
                            {76, "100000baseSR/Full"},
                            {77, "100000baseLR_ER_FR/Full"},
                            {79, "100000baseDR/Full"},
                            {78, "100000baseCR/Full"},
                            {80, "200000baseKR2/Full"},
                            {81, "200000baseSR2/Full"},
                            {82, "200000baseLR2_ER2_FR2/Full"},
                            {83, "200000baseDR2/Full"},
                            {84, "200000baseCR2/Full"},
                            {85, "400000baseKR4/Full"},
                            {86, "400000baseSR4/Full"},
                            {87, "400000baseLR4_ER4_FR4/Full"},
                            {88, "400000baseDR4/Full"},
                            {89, "400000baseCR4/Full"},
                            {90, "100baseFX/Half"},
                            {91, "100baseFX/Full"},
                            {92, "10baseT1L/Full"}};

/// One of the masks.
class Modes {
public:
    Modes(const LinkSettings& settings, LinkSettings::Mask mask) : settings_(settings), mask_(mask) {}

    bool has(unsigned bit) const { return settings_.has(mask_, bit); }

private:
    const LinkSettings& settings_;
    LinkSettings::Mask mask_;
};

void addErrorCorrections(Text& text, const Modes& modes) {
    bool any = false;
    for (const auto& [bit, name] : errorCorrections) {
        if (!modes.has(bit)) continue;
        text.add(any ? " " : "").add(name);
        any = true;
    }
    if (!any) text.add("Not reported");
}

/// The full duplex of a speed stands on the line of its half duplex, should this be there or not.
void addSpeeds(Text& text, const Modes& modes, std::size_t indent) {
    bool any = false;
    bool newLine = false;
    bool sameLine = false;
    for (const auto& [bit, name] : speeds) {
        newLine = newLine || (any && !sameLine);
        sameLine = name.ends_with("/Half");
        if (!modes.has(bit)) continue;
        if (newLine) text.add("\n\t").left("", indent);
        text.add(name).add(' ');
        any = true;
        newLine = false;
    }
    text.add(any ? "\n" : "Not reported\n");
}

struct Labels {
    std::string_view whose;      ///< "Supported"
    std::string_view negotiate;  ///< "Supports"
    std::size_t indent;
};

constexpr Labels labels[LinkSettings::masks] = {{"Supported", "Supports", 24},
                                                {"Advertised", "Advertised", 24},
                                                {"Link partner advertised", "Link partner advertised", 37}};

void addModes(Text& text, const Modes& modes, const Labels& label) {
    const std::size_t mark = text.size() + 1;
    text.add("\t").add(label.whose).add(" link modes:").padLeftAligned(mark, label.indent);
    addSpeeds(text, modes, label.indent);
    text.add("\t").add(label.whose).add(" pause frame use: ");
    addPause(text, modes.has(ETHTOOL_LINK_MODE_Pause_BIT), modes.has(ETHTOOL_LINK_MODE_Asym_Pause_BIT));
    text.add("\n\t").add(label.negotiate).add(" auto-negotiation: ");
    text.add(modes.has(ETHTOOL_LINK_MODE_Autoneg_BIT) ? "Yes\n\t" : "No\n\t");
    text.add(label.whose).add(" FEC modes: ");
    addErrorCorrections(text, modes);
    text.add('\n');
}

void addSettings(Text& text, const LinkSettings& settings) {
    text.add("\tSupported ports: [ ");
    for (const auto& [bit, name] : ports) {
        if (settings.has(LinkSettings::supported, bit)) text.add(name).add(' ');
    }
    text.add("]\n");
    for (const auto mask : {LinkSettings::supported, LinkSettings::advertised, LinkSettings::partner}) {
        const bool isTold = mask != LinkSettings::partner || settings.any(mask);
        if (isTold) addModes(text, {settings, mask}, labels[mask]);
    }
    const ethtool_link_settings& head = settings.head();
    addSpeed(text.add("\tSpeed: "), head.speed);
    addDuplex(text.add("\n\tDuplex: "), head.duplex);
    addPort(text.add("\n\tPort: "), head.port);
    text.add("\n\tPHYAD: ").number(unsigned{head.phy_address}).add("\n\tTransceiver: ");
    addTransceiver(text, head.transceiver);
    text.add("\n\tAuto-negotiation: ").add(head.autoneg == AUTONEG_DISABLE ? "off\n" : "on\n");
    if (head.port != PORT_TP) return;
    addCrossover(text.add("\tMDI-X: "), head.eth_tp_mdix, head.eth_tp_mdix_ctrl);
    text.add('\n');
}

void addMessageLevel(Text& text, std::uint32_t level) {
    text.add("\tCurrent message level: 0x").hex(level, 8).add(" (").number(static_cast<int>(level));
    text.add(")\n\t\t\t      ");
    std::uint32_t rest = level;
    for (unsigned bit = 0; bit < 32; ++bit) {
        if (messageClass(bit).empty() || (level >> bit & 1U) == 0) continue;
        text.add(' ').add(messageClass(bit));
        rest &= ~(1U << bit);
    }
    if (rest != 0) text.add(" 0x").hex(rest);
    if (level == 0) text.add(' ');
    text.add('\n');
}

/// The calls about one interface. What fails for another reason than that the driver has no answer is
/// complained of.
class Calls {
public:
    Calls(std::string_view name, Answer& answer) : driver_(name), answer_(answer) {}

    void run() {
        addOf("device settings", [this] { return settings(); });
        addOf("wake-on-lan settings", [this] { return wakeUp(); });
        addOf("message level", [this] { return messageLevel(); });
        addOf("link status", [this] { return link(); });
    }
    bool haveTold() const { return told_; }

private:
    /// @param question gives 0 or an error number
    template <typename Question>
    void addOf(std::string_view what, const Question& question) {
        const int error = question();
        told_ = told_ || error == 0;
        if (error != 0 && error != EOPNOTSUPP) {
            answer_.errors.add("Cannot get ").add(what).add(": ").add(std::strerror(error)).add('\n');
        }
    }
    int settings() const {
        LinkSettings settings;
        const int error = settings.read(driver_);
        if (error == 0) addSettings(answer_.out, settings);
        return error;
    }
    int wakeUp() const {
        ethtool_wolinfo told{};
        told.cmd = ETHTOOL_GWOL;
        if (const int error = driver_.ask(&told); error != 0) return error;
        addWakeOnLan(answer_.out, told.supported, told.wolopts);
        const std::string_view password(reinterpret_cast<const char*>(told.sopass), sizeof told.sopass);
        if ((told.supported & WAKE_MAGICSECURE) != 0) addPassword(answer_.out, password);
        return 0;
    }
    int messageLevel() const {
        ethtool_value told{};
        told.cmd = ETHTOOL_GMSGLVL;
        const int error = driver_.ask(&told);
        if (error == 0) addMessageLevel(answer_.out, told.data);
        return error;
    }
    int link() const {
        ethtool_value told{};
        told.cmd = ETHTOOL_GLINK;
        const int error = driver_.ask(&told);
        if (error == 0) answer_.out.add("\tLink detected: ").add(told.data != 0 ? "yes\n" : "no\n");
        return error;
    }

    DriverCalls driver_;
    Answer& answer_;
    bool told_ = false;
};

}  // namespace

int listLinkByCalls(std::string_view name, Answer& answer) {
    constexpr int nothingKnown = 75;
    if (name.size() >= IFNAMSIZ) {
        answer.errors.add("netlink interface initialization failed, device name longer than ");
        answer.errors.number(IFNAMSIZ - 1).add(" not supported\n");
        return 1;
    }
    answer.out.add("Settings for ").add(name).add(":\n");
    Calls calls(name, answer);
    calls.run();
    if (calls.haveTold()) return 0;
    answer.out.add("No data available\n");
    return nothingKnown;
}

}  // namespace hosttools
