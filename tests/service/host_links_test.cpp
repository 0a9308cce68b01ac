// What the kernel's announcements come to, byte by byte.
#include <gmock/gmock.h>
#include <linux/if.h>
#include <linux/rtnetlink.h>

#include <cstring>

#include "agent/service/concerns.h"
#include "agent/service/host_links.h"

namespace {

using namespace cvagent::service;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;

std::string padded(std::string text) {
    text.resize((text.size() + 3) / 4 * 4);
    return text;
}

template <class Value>
std::string bytes(const Value& value) {
    return {reinterpret_cast<const char*>(&value), sizeof value};
}

std::string attribute(unsigned short type, const std::string& content) {
    return padded(bytes(rtattr{static_cast<unsigned short>(sizeof(rtattr) + content.size()), type}) +
                  content);
}

template <class Fixed>
std::string message(unsigned short type, const Fixed& fixed, const std::string& attributes) {
    const std::string body = padded(bytes(fixed)) + attributes;
    return bytes(nlmsghdr{static_cast<unsigned int>(sizeof(nlmsghdr) + body.size()), type, 0, 0, 0}) + body;
}

std::string link(int index, const std::string& name, const std::string& more = "",
                 unsigned short type = RTM_NEWLINK, unsigned char family = AF_UNSPEC,
                 unsigned int flags = 0) {
    ifinfomsg fixed{};
    fixed.ifi_family = family;
    fixed.ifi_index = index;
    fixed.ifi_flags = flags;
    return message(type, fixed, attribute(IFLA_IFNAME, name + '\0') + more);
}

std::string info(unsigned short type, const std::string& kind) {
    return attribute(IFLA_LINKINFO, attribute(type, kind + '\0'));
}

HeardNews hear(HostLinks& links, const std::string& text) {
    HeardNews heard;
    takeRouteNews(text, links, heard);
    return heard;
}

TEST(HostLinks, AreThoseThatAreAnnounced) {
    HostLinks links;
    const HeardNews heard =
        hear(links,
             link(2, "eth0", attribute(IFLA_ADDRESS, std::string(6, '\0')), RTM_NEWLINK, AF_UNSPEC, IFF_UP) +
                 link(3, "br0p", attribute(IFLA_MASTER, bytes(9)) + info(IFLA_INFO_SLAVE_KIND, "bridge")));
    EXPECT_TRUE(heard.linksDiffer);
    EXPECT_THAT(heard.concerned, ElementsAre(Pair(2, concernsAll), Pair(3, concernsAll)));
    EXPECT_EQ(links.at(2), (HostLink{"eth0", 0, false, true, false, false, true}));
    EXPECT_EQ(links.at(3), (HostLink{"br0p", 9, true, false, false, false, false}));
    EXPECT_FALSE(hear(links, link(2, "eth0", attribute(IFLA_ADDRESS, std::string(6, '\0')))).linksDiffer)
        << "to be switched off makes it no other link";
    EXPECT_FALSE(links.at(2).isUp);
}

TEST(HostLinks, HaveTheNameThatTheyHadInTheirLastNews) {
    HostLinks links;
    hear(links, link(2, "eth0"));
    HeardNews heard = hear(links, link(2, "enp3s0"));
    EXPECT_THAT(heard.formerNames, ElementsAre(Pair(2, "eth0")));
    EXPECT_TRUE(heard.linksDiffer);
    heard = hear(links, link(2, "enp3s0", "", RTM_DELLINK));
    EXPECT_THAT(heard.formerNames, ElementsAre(Pair(2, "enp3s0")));
    EXPECT_THAT(links, IsEmpty());
}

TEST(HostLinks, StayWhenOnlyAPartOfThemIsAnnounced) {
    HostLinks links;
    hear(links, link(2, "eth0", info(IFLA_INFO_KIND, "bond")));
    const HeardNews left = hear(links, link(2, "eth0", "", RTM_DELLINK, AF_BRIDGE));  // it has left a bridge
    EXPECT_FALSE(left.linksDiffer);
    EXPECT_THAT(left.concerned, ElementsAre(Pair(2, concernsAll)));
    EXPECT_FALSE(hear(links, link(2, "eth0", attribute(IFLA_WIRELESS, "1234"))).linksDiffer);
    EXPECT_TRUE(links.at(2).isBond);
}

TEST(HostLinks, OfOneBondConcernEachOther) {
    HostLinks links;
    const std::string member = attribute(IFLA_MASTER, bytes(9));
    hear(links, link(9, "bond0", info(IFLA_INFO_KIND, "bond")) + link(2, "eth0", member) +
                    link(3, "eth1", member) + link(4, "eth2"));
    EXPECT_THAT(hear(links, link(2, "eth0")).concerned,
                ElementsAre(Pair(2, concernsAll), Pair(3, concernsLink), Pair(9, concernsLink)))
        << "it has left";
}

TEST(HostLinks, HaveAddressesAndRoutes) {
    HostLinks links;
    ifaddrmsg address{};
    address.ifa_index = 2;
    rtmsg route{};
    const HeardNews heard = hear(links, message(RTM_DELADDR, address, "") +
                                            message(RTM_NEWROUTE, route, attribute(RTA_OIF, bytes(3))) +
                                            message(RTM_DELROUTE, route, ""));
    EXPECT_FALSE(heard.linksDiffer);
    EXPECT_THAT(heard.concerned, ElementsAre(Pair(0, concernsRoute), Pair(2, concernsAddress | concernsRoute),
                                             Pair(3, concernsRoute)));
}

TEST(HostLinks, AreNotReadBeyondAnAnnouncement) {
    const std::string whole =
        link(2, "eth0", info(IFLA_INFO_KIND, "bond") + attribute(IFLA_ADDRESS, "123456"));
    for (std::size_t size = 0; size < whole.size(); ++size) {
        HostLinks links;
        const std::string cut = whole.substr(0, size);
        hear(links, cut);
        EXPECT_THAT(links, IsEmpty()) << size;
        std::string lying = cut;  // its header tells of the cut length
        const auto told = static_cast<unsigned int>(size);
        if (size >= sizeof(nlmsghdr)) {
            std::memcpy(lying.data(), &told, sizeof told);
            hear(links, lying);
        }
    }
}

TEST(HostChange, IsOfALinkOrOfAll) {
    HostChange change;
    change.names["eth0"] = concernsLink;
    HostChange later;
    later.names[""] = concernsRoute;
    change.add(later);
    EXPECT_EQ(change.concernOf("eth0"), concernsLink | concernsRoute);
    EXPECT_EQ(change.concernOf("eth1"), concernsRoute);
    EXPECT_EQ(change.concernOf("eth"), concernsLink | concernsRoute)
        << "the plug-in takes its lines for this one's";
    EXPECT_THAT(concernedProperties(29, concernsRoute), ElementsAre(100, 101));
    EXPECT_THAT(concernedProperties(12, concernsRoute), IsEmpty());
}

TEST(DeviceNews, NameTheirSubsystem) {
    using namespace std::string_literals;
    EXPECT_EQ(subsystemOfDevice("add@/devices/x\0ACTION=add\0SUBSYSTEM=block\0SEQNUM=1\0"s), "block");
    EXPECT_EQ(subsystemOfDevice("SUBSYSTEM=block"), "");
    EXPECT_EQ(subsystemOfDevice("\0SUBSYSTEM="s), "");
}

}  // namespace
