#include "network/bonding_status.h"

#include <gtest/gtest.h>

namespace {

using IC::parse::bondingMember;
using Lines = std::vector<std::string>;

const Lines kTwo = {"MII Status: up\n",
                    "Slave Interface: eth10\n",
                    "MII Status: down\n",
                    "Link Failure Count: 10\n",
                    "\n",
                    "Slave Interface: eth1\n",
                    "MII Status: going back\n",
                    "Speed: 100 Mbps\n",
                    "MII Status: x\n",
                    "Link Failure Count: 1"};

TEST(BondingStatus, SectionIsThePortsOwn) {
    const auto member = bondingMember(kTwo, "eth1");
    ASSERT_TRUE(member);
    EXPECT_EQ(member->miiStatus, "going");
    EXPECT_EQ(member->linkFailures, "1");
    const auto other = bondingMember(kTwo, "eth10");
    ASSERT_TRUE(other);
    EXPECT_EQ(other->miiStatus, "down");
    EXPECT_EQ(other->linkFailures, "10");
}

TEST(BondingStatus, NamesThatOnlyLookLikeAMemberAreNone) {
    for (const char* port : {"eth", "eth100", "ETH1", "eth1 ", "", "th1", "eth1\nMII"}) {
        EXPECT_FALSE(bondingMember(kTwo, port)) << port;
    }
    EXPECT_FALSE(bondingMember({}, "eth1"));
    EXPECT_FALSE(bondingMember(
        {"xSlave Interface: eth1\n", " Slave Interface: eth1\n", "Slave Interface:eth1\n"}, "eth1"));
}

TEST(BondingStatus, SectionWithoutTheFactsHasEmptyOnes) {
    const auto member = bondingMember({"Slave Interface: eth1\n", " MII Status: up\n", "MII Status:\n",
                                       "Slave Interface: eth2\n", "MII Status: up\n"},
                                      "eth1");
    ASSERT_TRUE(member);
    EXPECT_EQ(member->miiStatus, "");
    EXPECT_EQ(member->linkFailures, "");
}

}  // namespace
