// What speaks against changes that are made together, and the order in which they are made.
#include "agent/change/checks.h"

#include <gmock/gmock.h>
#include <linux/rtnetlink.h>
#include <sys/timex.h>

#include "agent/change/clock_source.h"
#include "agent/change/order.h"

namespace {

using cvagent::change::HostFacts;
using cvagent::change::Ip;
using cvagent::change::KernelAddress;
using cvagent::change::KernelRoute;
using cvagent::change::Wanted;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

constexpr unsigned int kAddress = 25;
constexpr unsigned int kMask = 26;
constexpr unsigned int kIpv6Address = 27;
constexpr unsigned int kDns = 94;
constexpr unsigned int kGateway = 100;
constexpr unsigned int kIpv6Gateway = 101;
constexpr unsigned int kPrefixLength = 102;
constexpr unsigned int kClock = 126;

KernelAddress address(unsigned link, const std::string& text, unsigned prefix,
                      const std::string& label = "") {
    KernelAddress made;
    made.link = link;
    made.ip = *Ip::parse(text);
    made.prefix = prefix;
    made.label = label;
    made.isPermanent = made.isGlobal = true;
    return made;
}

/// eth0 with 192.0.2.10/24 and 2001:db8::10/64, eth1 with 198.51.100.1/24, eth2 without any; a way to
/// 203.0.113.0/24 by eth1, and none to 10.1.0.0/24.
HostFacts host() {
    HostFacts facts;
    facts.network.links = {{1, "lo", true}, {2, "eth0", true}, {3, "eth1", true}, {4, "eth2", true}};
    facts.network.addresses = {address(1, "127.0.0.1", 8, "lo"), address(2, "192.0.2.10", 24, "eth0"),
                               address(2, "2001:db8::10", 64), address(3, "198.51.100.1", 24, "eth1")};
    KernelRoute way;
    way.destination = *Ip::parse("203.0.113.0");
    way.prefix = 24;
    way.link = 3;
    way.protocol = 4;
    way.type = RTN_UNICAST;
    KernelRoute nowhere = way;
    nowhere.destination = *Ip::parse("10.1.0.0");
    nowhere.type = RTN_BLACKHOLE;
    facts.network.routes = {way, nowhere};
    return facts;
}

Wanted ofLink(unsigned int property, const std::string& word, const std::string& link = "eth0") {
    return {property, {word}, link, false};
}

/// "0: reason" of each objection.
std::vector<std::string> objections(const std::vector<Wanted>& changes, const HostFacts& facts = host()) {
    std::vector<std::string> texts;
    for (const auto& each : objectionsTo(changes, facts)) {
        texts.push_back(std::to_string(each.change) + ": " + each.reason);
    }
    return texts;
}

struct Case {
    std::vector<Wanted> changes;
    std::string objection;  ///< "" for none
};

TEST(Checks, LookAtEachChangeBesideTheOthers) {
    const std::vector<Case> cases = {
        {{ofLink(kAddress, "192.0.2.20")}, ""},
        {{ofLink(kAddress, "192.0.2.10")}, ""},
        {{ofLink(kAddress, "198.51.100.1")}, "0: 198.51.100.1 is the address of eth1"},
        {{ofLink(kAddress, "198.51.100.1"), ofLink(kAddress, "198.51.100.2", "eth1")}, ""},
        {{ofLink(kAddress, "192.0.2.77"), ofLink(kAddress, "192.0.2.77", "eth1")},
         "0: 192.0.2.77 is the address of eth1"},
        {{ofLink(kAddress, "192.0.2.0")}, "0: 192.0.2.0 is the network address of 192.0.2.0/24"},
        {{ofLink(kAddress, "192.0.2.255")}, "0: 192.0.2.255 is the broadcast address of 192.0.2.0/24"},
        {{ofLink(kAddress, "192.0.2.255"), ofLink(kMask, "255.255.0.0")}, ""},
        {{ofLink(kAddress, "192.0.2.128"), ofLink(kMask, "255.255.255.128")},
         "0: 192.0.2.128 is the network address of 192.0.2.128/25"},
        {{ofLink(kAddress, "192.0.2.128"), ofLink(kMask, "255.255.255.254")}, ""},
        {{ofLink(kMask, "255.255.255.0")}, ""},
        {{ofLink(kMask, "255.255.255.252")}, ""},
        {{ofLink(kMask, "255.255.255.0", "eth2")}, "0: eth2 has no address that it could belong to"},
        {{ofLink(kAddress, "10.0.0.1", "eth2"), ofLink(kMask, "255.255.255.0", "eth2")}, ""},
        {{ofLink(kPrefixLength, "64", "eth2")}, "0: eth2 has no address that it could belong to"},
        {{ofLink(kGateway, "192.0.2.1")}, ""},
        {{ofLink(kGateway, "198.51.100.254")}, ""},
        {{ofLink(kGateway, "203.0.113.9")}, ""},
        {{ofLink(kGateway, "10.9.9.9")}, "0: 10.9.9.9 is in no subnet of this host"},
        {{ofLink(kGateway, "10.1.0.9")}, "0: 10.1.0.9 is in no subnet of this host"},
        {{ofLink(kGateway, "10.9.9.9"), ofLink(kAddress, "10.9.9.1")}, ""},
        {{ofLink(kGateway, "192.0.2.1"), ofLink(kAddress, "10.9.9.1")},
         "0: 192.0.2.1 is in no subnet of this host"},
        {{ofLink(kGateway, "192.0.2.10")}, "0: 192.0.2.10 is the address of eth0 itself"},
        {{ofLink(kGateway, "192.0.2.255")}, "0: 192.0.2.255 is the broadcast address of 192.0.2.0/24"},
        {{ofLink(kIpv6Address, "2001:db8::11")}, ""},
        {{ofLink(kIpv6Address, "2001:db8::")}, "0: 2001:db8:: stands for any router of 2001:db8::/64"},
        {{ofLink(kIpv6Address, "2001:db8::10", "eth1")}, "0: 2001:db8::10 is the address of eth0"},
        {{ofLink(kIpv6Gateway, "fe80::1")}, ""},
        {{ofLink(kIpv6Gateway, "2001:db8::1")}, ""},
        {{ofLink(kIpv6Gateway, "2001:db8:7::1")}, "0: 2001:db8:7::1 is in no subnet of this host"},
        {{ofLink(kDns, "192.0.2.53")}, ""},
        {{ofLink(kDns, "8.8.8.8")}, ""},
        {{ofLink(kDns, "127.0.0.53")}, ""},
        {{ofLink(kDns, "192.0.2.255")}, "0: no name server can be there: 192.0.2.255 is the broadcast"},
    };
    for (const Case& each : cases) {
        const auto found = objections(each.changes);
        const std::string words = each.changes[0].words[0];
        if (each.objection.empty()) {
            EXPECT_THAT(found, IsEmpty()) << words;
        } else {
            ASSERT_FALSE(found.empty()) << words;
            EXPECT_THAT(found[0], HasSubstr(each.objection)) << words;
        }
    }
}

TEST(Checks, TakeTheFileForWhatIsNotRunning) {
    HostFacts facts = host();
    facts.files["eth2"].ipv4Address = "10.0.0.5";
    facts.files["eth2"].mask = "255.255.0.0";
    EXPECT_THAT(objections({ofLink(kMask, "255.255.255.0", "eth2")}, facts), IsEmpty());
    EXPECT_THAT(objections({ofLink(kAddress, "10.0.255.255", "eth2")}, facts),
                ElementsAre(HasSubstr("broadcast address of 10.0.0.0/16")));
}

TEST(Checks, SayNothingOfAnInterfaceThatTheKernelHasNot) {
    EXPECT_THAT(objections({ofLink(kGateway, "10.9.9.9", "eth9"), ofLink(kMask, "255.0.0.0", "eth9"),
                            ofLink(kAddress, "192.0.2.10", "eth0:1")}),
                IsEmpty());
}

TEST(Checks, KeepTheClockFromWhoSteersIt) {
    HostFacts facts = host();
    const std::vector<Wanted> clock = {{kClock, {"2026-11-20T21:03:00Z"}, "", true}};
    EXPECT_THAT(objections(clock, facts), IsEmpty());
    facts.clockSteeredBy = "chronyd";
    EXPECT_THAT(objections(clock, facts), ElementsAre(HasSubstr("chronyd keeps the clock in step")));
    EXPECT_THAT(objections({ofLink(kClock, "x")}, facts), IsEmpty()) << "that is no computer's";
}

TEST(ClockSource, IsAProgramAtWorkOrWhatTheKernelTells) {
    using cvagent::change::clockSteeredBy;
    EXPECT_EQ(clockSteeredBy({{1, "init"}, {2, "chronyd"}}, STA_UNSYNC), "chronyd");
    EXPECT_EQ(clockSteeredBy({{1, "init"}, {2, "chronyd2"}}, STA_UNSYNC), "");
    EXPECT_EQ(clockSteeredBy({}, STA_PLL), "something");
    EXPECT_EQ(clockSteeredBy({}, STA_PLL | STA_UNSYNC), "");
    EXPECT_EQ(clockSteeredBy({}, std::nullopt), "") << "the kernel tells nothing";
}

TEST(Order, LetsEachChangeFindWhatItNeeds) {
    const std::vector<Wanted> changes = {
        {123, {"9"}, "", true},  ofLink(123, "12", "eth1"),      {126, {"x"}, "", true},
        {127, {"60"}, "", true}, ofLink(94, "192.0.2.53"),       ofLink(100, "192.0.2.1"),
        ofLink(26, "255.0.0.0"), ofLink(25, "192.0.2.9"),        ofLink(123, "1"),
        ofLink(24, "3"),         ofLink(25, "192.0.2.8", "eth1")};
    // origin, up, the two addresses in their order, mask, gateway, name servers, zone, clock, down, restart
    EXPECT_THAT(orderOf(changes), ElementsAre(9, 8, 7, 10, 6, 5, 4, 3, 2, 1, 0));
}

TEST(Ip, KnowsItsSubnet) {
    const Ip ip = *Ip::parse("192.0.2.77");
    EXPECT_EQ(ip.first(26).text(), "192.0.2.64");
    EXPECT_EQ(ip.last(26).text(), "192.0.2.127");
    EXPECT_EQ(ip.first(0).text(), "0.0.0.0");
    EXPECT_EQ(ip.last(32), ip);
    EXPECT_TRUE(ip.sharesPrefix(*Ip::parse("192.0.2.64"), 26));
    EXPECT_FALSE(ip.sharesPrefix(*Ip::parse("192.0.2.63"), 26));
    EXPECT_FALSE(ip.sharesPrefix(*Ip::parse("::"), 0)) << "another protocol";
    EXPECT_EQ(Ip::parse("2001:db8::ff00")->first(121).text(), "2001:db8::ff00");
    EXPECT_EQ(cvagent::change::prefixOfMask("255.255.240.0"), 20U);
    EXPECT_EQ(cvagent::change::prefixOfMask("0.0.0.0"), 0U);
    EXPECT_EQ(cvagent::change::prefixOfMask("255.0.255.0"), std::nullopt);
    EXPECT_EQ(cvagent::change::prefixOfMask("ffff::"), std::nullopt);
}

}  // namespace
