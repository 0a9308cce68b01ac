// Network cards that no test machine has: what our ethtool prints of the kernel's answers beside what the
// system's own prints of the same.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <linux/ethtool.h>
#include <linux/ethtool_netlink.h>
#include <linux/netlink.h>

#include <cerrno>
#include <filesystem>
#include <fstream>

#include "hosttools/ethtool_listing.h"
#include "hosttools/netlink.h"
#include "tests/hosttools/network_namespace.h"

namespace {

using hosttools::bytesOf;
using hosttools::LinkReplies;
using hosttools::makeAttribute;
using testing::HasSubstr;

constexpr std::array<unsigned, hosttools::linkQuestions> kCommands = {
    ETHTOOL_MSG_LINKMODES_GET, ETHTOOL_MSG_LINKINFO_GET, ETHTOOL_MSG_WOL_GET, ETHTOOL_MSG_DEBUG_GET,
    ETHTOOL_MSG_LINKSTATE_GET};

std::string byte(unsigned type, unsigned value) {
    return makeAttribute(type, bytesOf(static_cast<std::uint8_t>(value)));
}

std::string word(unsigned type, std::uint32_t value) {
    return makeAttribute(type, bytesOf(value));
}

std::string nest(unsigned type, const std::string& inner) {
    return makeAttribute(NLA_F_NESTED | type, inner);
}

std::string header() {
    return nest(ETHTOOL_A_LINKMODES_HEADER,
                word(ETHTOOL_A_HEADER_DEV_INDEX, 1) +
                    makeAttribute(ETHTOOL_A_HEADER_DEV_NAME, std::string_view("lo", 3)));
}

struct NamedBit {
    unsigned index;
    std::string name;
    bool on = true;
};

/// As the kernel writes one that it was not asked to keep short.
std::string bitset(unsigned type, const std::vector<NamedBit>& bits, bool noMask = false) {
    std::string list;
    for (const NamedBit& bit : bits) {
        std::string inner = word(ETHTOOL_A_BITSET_BIT_INDEX, bit.index);
        inner += makeAttribute(ETHTOOL_A_BITSET_BIT_NAME, bit.name + '\0');
        if (bit.on && !noMask) inner += makeAttribute(ETHTOOL_A_BITSET_BIT_VALUE, "");
        list += nest(ETHTOOL_A_BITSET_BITS_BIT, inner);
    }
    return nest(type, (noMask ? makeAttribute(ETHTOOL_A_BITSET_NOMASK, "") : "") +
                          word(ETHTOOL_A_BITSET_SIZE, 121) + nest(ETHTOOL_A_BITSET_BITS, list));
}

const std::vector<NamedBit> kTwistedPair = {{0, "10baseT/Half"},
                                            {1, "10baseT/Full"},
                                            {2, "100baseT/Half"},
                                            {3, "100baseT/Full", false},
                                            {5, "1000baseT/Full"},
                                            {6, "Autoneg"},
                                            {7, "TP"},
                                            {9, "MII", false},
                                            {13, "Pause", false},
                                            {14, "Asym_Pause"},
                                            {47, "2500baseT/Full"}};
const std::vector<NamedBit> kFibre = {{10, "FIBRE"},
                                      {11, "BNC"},
                                      {13, "Pause"},
                                      {16, "Backplane"},
                                      {17, "1000baseKX/Full"},
                                      {19, "10000baseKR/Full"},
                                      {31, "25000baseCR/Full"},
                                      {49, "None"},
                                      {50, "RS", false},
                                      {51, "BASER"},
                                      {74, "LLRS"},
                                      {90, "100baseFX/Half"},
                                      {91, "100baseFX/Full"},
                                      {99, "10baseT1S/Full"},
                                      {100, "10baseT1S/Half"},
                                      {101, "10baseT1S_P2MP/Half"},
                                      {102, "10baseT1BRR/Full"},
                                      {103, "200000baseCR/Full"},
                                      {120, "not_yet/Full"}};
const std::vector<NamedBit> kWake = {{0, "phy"}, {1, "ucast", false}, {2, "mcast"},       {3, "bcast", false},
                                     {4, "arp"}, {5, "magic"},        {6, "magicsecure"}, {7, "filter"}};

/// The kernel's answers; what is not given has none.
class Card {
public:
    Card& modes(const std::string& attributes) { return set(hosttools::linkModes, attributes); }
    Card& info(const std::string& attributes) { return set(hosttools::linkInfo, attributes); }
    Card& wake(const std::string& attributes) { return set(hosttools::wakeOnLan, attributes); }
    Card& messages(const std::string& attributes) { return set(hosttools::messageLevel, attributes); }
    Card& state(const std::string& attributes) { return set(hosttools::linkState, attributes); }

    /// All questions answered.
    static Card whole() {
        return Card().modes("").info("").wake("").messages("").state(byte(ETHTOOL_A_LINKSTATE_LINK, 1));
    }
    const LinkReplies& replies() const { return replies_; }

private:
    Card& set(std::size_t question, const std::string& attributes) {
        replies_[question].attributes = header() + attributes;
        return *this;
    }
    LinkReplies replies_;
};

class Ethtool : public testing::Test {
protected:
    void SetUp() override {
        if (!hasProgram("ethtool")) GTEST_SKIP() << "ethtool is not installed";
        if (sizeof(void*) != 8) GTEST_SKIP() << "the system's programs cannot load what is built for 32 bits";
        directory_ = testing::TempDir() + "/ethtool." + std::to_string(getpid());
        std::filesystem::create_directories(directory_);
    }
    void TearDown() override {
        if (!directory_.empty()) std::filesystem::remove_all(directory_);
    }

    void expectSame(const Card& card) {
        for (std::size_t number = 0; number < kCommands.size(); ++number) {
            std::ofstream(directory_ + "/" + std::to_string(kCommands[number]), std::ios::binary)
                << card.replies()[number].attributes;
        }
        const Outcome real =
            shell("FAKE_ETHTOOL=" + directory_ + " LD_PRELOAD=" FAKE_ETHTOOL_KERNEL " ethtool lo");
        EXPECT_EQ(real.errors, "");
        EXPECT_EQ(real.status, 0);
        EXPECT_EQ(hosttools::listLink(card.replies()).str(), real.output);
        EXPECT_THAT(real.output, HasSubstr("Settings for lo:\n"));
    }

private:
    std::string directory_;
};

TEST_F(Ethtool, TwistedPair) {
    expectSame(
        Card::whole()
            .modes(
                byte(ETHTOOL_A_LINKMODES_AUTONEG, 1) + bitset(ETHTOOL_A_LINKMODES_OURS, kTwistedPair) +
                bitset(ETHTOOL_A_LINKMODES_PEER, {{1, "10baseT/Full"}, {6, "Autoneg"}, {13, "Pause"}}, true) +
                word(ETHTOOL_A_LINKMODES_SPEED, 1000) + byte(ETHTOOL_A_LINKMODES_DUPLEX, DUPLEX_FULL) +
                byte(ETHTOOL_A_LINKMODES_MASTER_SLAVE_CFG, MASTER_SLAVE_CFG_SLAVE_PREFERRED) +
                byte(ETHTOOL_A_LINKMODES_MASTER_SLAVE_STATE, MASTER_SLAVE_STATE_ERR))
            .info(byte(ETHTOOL_A_LINKINFO_PORT, PORT_TP) + byte(ETHTOOL_A_LINKINFO_PHYADDR, 255) +
                  byte(ETHTOOL_A_LINKINFO_TP_MDIX, ETH_TP_MDI_X) +
                  byte(ETHTOOL_A_LINKINFO_TP_MDIX_CTRL, ETH_TP_MDI_AUTO) +
                  byte(ETHTOOL_A_LINKINFO_TRANSCEIVER, XCVR_EXTERNAL))
            .wake(bitset(ETHTOOL_A_WOL_MODES, kWake) +
                  makeAttribute(ETHTOOL_A_WOL_SOPASS, std::string_view("\1\2\xab\0\5\6", 6)))
            .messages(bitset(ETHTOOL_A_DEBUG_MSGMASK,
                             {{0, "drv"}, {1, "probe"}, {2, "link"}, {3, "timer", false}, {14, "wol"}})));
}

TEST_F(Ethtool, FibreAndModesThatTheToolDoesNotKnow) {
    expectSame(
        Card::whole()
            .modes(byte(ETHTOOL_A_LINKMODES_AUTONEG, 0) + bitset(ETHTOOL_A_LINKMODES_OURS, kFibre) +
                   bitset(ETHTOOL_A_LINKMODES_PEER, kFibre, true) + word(ETHTOOL_A_LINKMODES_SPEED, 100000) +
                   byte(ETHTOOL_A_LINKMODES_DUPLEX, 0) + word(ETHTOOL_A_LINKMODES_LANES, 4))
            .info(byte(ETHTOOL_A_LINKINFO_PORT, PORT_DA) + byte(ETHTOOL_A_LINKINFO_TP_MDIX, ETH_TP_MDI_X) +
                  byte(ETHTOOL_A_LINKINFO_TP_MDIX_CTRL, ETH_TP_MDI_AUTO))
            .wake(bitset(ETHTOOL_A_WOL_MODES, {{5, "magic", false}})));
}

TEST_F(Ethtool, Speeds) {
    for (const std::uint32_t speed : {0U, 10U, 65535U, 65536U, 4294967295U, 2147484U}) {
        expectSame(Card::whole().modes(word(ETHTOOL_A_LINKMODES_SPEED, speed)));
    }
}

TEST_F(Ethtool, NumbersWithAndWithoutNames) {
    for (const unsigned number : {0U, 1U, 2U, 3U, 4U, 5U, 6U, 7U, 239U, 254U, 255U}) {
        expectSame(
            Card::whole()
                .modes(byte(ETHTOOL_A_LINKMODES_DUPLEX, number) + byte(ETHTOOL_A_LINKMODES_AUTONEG, number) +
                       byte(ETHTOOL_A_LINKMODES_MASTER_SLAVE_CFG, number) +
                       byte(ETHTOOL_A_LINKMODES_MASTER_SLAVE_STATE, number))
                .info(byte(ETHTOOL_A_LINKINFO_PORT, number) + byte(ETHTOOL_A_LINKINFO_TRANSCEIVER, number)));
    }
}

TEST_F(Ethtool, Crossing) {
    for (unsigned now = 0; now < 4; now += 2) {
        for (unsigned wanted = 0; wanted < 5; ++wanted) {
            expectSame(Card::whole().info(byte(ETHTOOL_A_LINKINFO_PORT, PORT_TP) +
                                          byte(ETHTOOL_A_LINKINFO_TP_MDIX, now) +
                                          byte(ETHTOOL_A_LINKINFO_TP_MDIX_CTRL, wanted)));
        }
    }
}

TEST_F(Ethtool, WhyThereIsNoLink) {
    const std::map<unsigned, unsigned> kDetails = {{0, 6}, {1, 4}, {2, 5}, {3, 4}, {4, 0}, {5, 2}, {10, 1}};
    for (unsigned reason = 0; reason < 13; ++reason) {
        const std::string down =
            byte(ETHTOOL_A_LINKSTATE_LINK, 0) + byte(ETHTOOL_A_LINKSTATE_EXT_STATE, reason);
        expectSame(Card::whole().state(down));
        const unsigned named = kDetails.contains(reason) ? kDetails.at(reason) : 0;
        for (unsigned detail = 0; named > 0 && detail <= named + 1; ++detail) {
            expectSame(Card::whole().state(down + byte(ETHTOOL_A_LINKSTATE_EXT_SUBSTATE, detail)));
        }
    }
}

TEST_F(Ethtool, SignalQuality) {
    const std::string up = byte(ETHTOOL_A_LINKSTATE_LINK, 1);
    expectSame(Card::whole().state(up + word(ETHTOOL_A_LINKSTATE_SQI, 5)));
    expectSame(
        Card::whole().state(up + word(ETHTOOL_A_LINKSTATE_SQI, 5) + word(ETHTOOL_A_LINKSTATE_SQI_MAX, 7)));
    expectSame(Card::whole().state(up + byte(ETHTOOL_A_LINKSTATE_EXT_STATE, 4)));
}

/// On a kernel that has the older calls only.
class EthtoolByCalls : public Ethtool {
protected:
    void SetUp() override {
        Ethtool::SetUp();
        if (!canUnshare()) GTEST_SKIP() << "namespaces are not available";
    }
    static void expectSame(const NetworkNamespace& network, const std::string& link,
                           const std::string& variables = "") {
        const std::string before = variables + " FAKE_ETHTOOL=none LD_PRELOAD=" FAKE_ETHTOOL_KERNEL " ";
        const Outcome real = network.shell(before + "ethtool " + link);
        const Outcome ours = network.shell(before + ETHTOOL_BY_CALLS " " + link);
        EXPECT_EQ(ours.output, real.output) << link << variables;
        EXPECT_EQ(ours.errors, real.errors) << link;
        EXPECT_EQ(ours.status, real.status) << link;
    }
};

// A sanitizer wants to be loaded before whatever is preloaded.
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)
TEST_F(EthtoolByCalls, KernelLinks) {
    const NetworkNamespace network;
    EXPECT_EQ(network.shell("ip link add v0 type veth peer name v1; ip link add br0 type bridge").status, 0);
    for (const char* link : {"v0", "br0", "lo", "nosuch", "averyverylongname"}) {
        expectSame(network, link);
    }
}

TEST_F(EthtoolByCalls, Cards) {
    const NetworkNamespace network;
    for (const int mode : {-1, 0, 1, 3, 6, 9, 13, 50, 92, 93, 127}) {
        expectSame(network, "lo", "FAKE_SETTINGS=" + std::to_string(mode));
    }
}
#endif

}  // namespace
