// What the kernel and the host's files say of a tree: each fact that is right passes, each that is wrong is
// found with the value that is right.
#include "agent/verify/verify.h"

#include <gmock/gmock.h>
#include <unistd.h>

#include <ctime>

#include "agent/core/catalogue.h"
#include "agent/verify/link_modes.h"
#include "tests/agent/node_list.h"
#include "tests/support/fake_host.h"

namespace {

using cvagent::NodeType;
using cvagent::Reading;
using cvagent::verify::Difference;
using cvagent::verify::Result;
using IC::Number;
using IC::PropertyValue;
using Texts = std::vector<std::string>;

struct Shown {
    unsigned int id;
    PropertyValue right;
    PropertyValue wrong{};  ///< none for the name by which the rest is looked up
    std::string kernel{};   ///< what is told in place of the wrong one
};

PropertyValue text(const char* value) {
    return {std::string(value), true};
}
PropertyValue number(unsigned int value) {
    return {Number(value), true};
}
PropertyValue code(unsigned int value) {
    return {IC::EnumValue(value), true};
}
PropertyValue yes(bool value) {
    return {Number(value), true};
}

Reading reading(NodeType type, unsigned int id, const PropertyValue& value) {
    Reading made;
    made.id = id;
    made.row = cvagent::findProperty(static_cast<unsigned int>(type), id);
    made.value = value;
    return made;
}

/// @param wrong the position of the one that is shown wrong; all are right behind the end
Result verified(NodeType type, const std::vector<Shown>& facts, std::size_t wrong, unsigned int index = 1) {
    NodeList list;
    list.add(static_cast<unsigned int>(type), 0, index);
    std::vector<Reading> readings;
    for (std::size_t i = 0; i < facts.size(); ++i) {
        readings.push_back(reading(type, facts[i].id, i == wrong ? facts[i].wrong : facts[i].right));
    }
    return cvagent::verify::verify(list.nodes(), {readings});
}

void expectEachFound(NodeType type, const std::vector<Shown>& facts, std::size_t absent = 0) {
    const Result right = verified(type, facts, facts.size());
    EXPECT_EQ(right.compared, facts.size() + absent);
    for (const Difference& each : right.differences) {
        ADD_FAILURE() << each.property << " is " << each.shown << ", the kernel says " << each.kernel;
    }
    for (std::size_t i = 0; i < facts.size(); ++i) {
        if (facts[i].wrong.empty()) {
            continue;
        }
        const Result found = verified(type, facts, i);
        ASSERT_EQ(found.differences.size(), 1U) << facts[i].id;
        EXPECT_EQ(found.differences[0].property,
                  cvagent::findProperty(static_cast<unsigned int>(type), facts[i].id)->name);
        EXPECT_EQ(found.differences[0].shown, static_cast<std::string>(facts[i].wrong));
        EXPECT_EQ(found.differences[0].kernel, facts[i].kernel) << facts[i].id;
        EXPECT_NE(found.differences[0].why, "");
    }
}

class Verify : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        host.realTool("ip");
        host.useKernelNetwork();
        for (const char* command :
             {"link add eth0 address 02:00:00:aa:bb:01 type veth peer name sw0", "link set eth0 up",
              "link set sw0 up", "address add 10.1.2.3/20 broadcast + dev eth0",
              "-6 address add 2001:db8:1:42::3/56 dev eth0 nodad", "route add default via 10.1.0.1",
              "-6 route add 2001:db8:f::/48 via 2001:db8:1:42::1"}) {
            const Finished done = host.run({"sh", "-c", std::string("ip ") + command});
            ASSERT_EQ(done.status, 0) << command << ": " << done.err;
        }
    }
};

HOST_TEST_F(Verify, FindsEachWrongFactOfAPort) {
    expectEachFound(NodeType::networkPort,
                    {{0, {Texts{"eth0"}, true}, {Texts{"eth9"}, true}, "eth0"},
                     {38, number(0), number(10), "0"},
                     {57, number(10000000), number(100000), "10000000"},
                     {67, yes(true), yes(false), "true"},
                     {82, yes(true), yes(false), "true"},
                     {108, text("eth0")},
                     {121, text("eth0"), text("eth9"), "eth0"},
                     {123, number(1), number(12), "1"},
                     {185, number(0), number(50), "0"},
                     {193, yes(false), yes(true), "false"},
                     {194, yes(false), yes(true), "false"},
                     {195, text(""), text("up"), ""},
                     {196, number(0), number(1), "0"},
                     {199, text(""), text("bond0"), ""}},
                    2);
}

HOST_TEST_F(Verify, FindsEachWrongFactOfAnIpConfiguration) {
    host.file("/etc/sysconfig/network/ifcfg-eth-id-02:00:00:aa:bb:01",
              "#BOOTPROTO=dhcp\nBOOTPROTO='static'\n");
    host.file("/etc/resolv.conf",
              "; by hand\nsearch example.com\texample.org\nnameserver 192.0.2.53 # the first\nnameserver "
              "2001:db8::53\n");
    host.file("/etc/hosts", "127.0.0.1 localhost\n10.1.2.3 linux.example.com linux # us\n");
    host.file("/var/lib/dhcpcd/dhcpcd-eth0.info", "IPADDR='10.1.2.3'\nDHCPSID='10.1.0.9'\n");
    host.file("/var/lib/dhcpv6/client6.leases", "lease {\n  SDUID 00:01:ab;\n}\n");
    host.setHostName("linux");
    const auto texts = [](const Texts& all) { return PropertyValue(all, true); };
    expectEachFound(
        NodeType::ipConfig,
        {{24, code(3), code(1), "3"},
         {25, text("10.1.2.3"), text("10.1.2.4"), "10.1.2.3"},
         {26, text("255.255.240.0"), text("255.255.255.0"), "255.255.240.0"},
         {27, text("2001:db8:1:42::3"), text("2001:db8::1"), "2001:db8:1:42::3"},
         {28, code(7), code(5), "7"},
         {29, text("42"), text("1"), "42"},
         {47, number(4098), number(4096), "4098"},
         {93, texts({"10.1.0.9", "00:01:ab"}), texts({}), "10.1.0.9 00:01:ab"},
         {94, texts({"192.0.2.53", "2001:db8::53"}), texts({"2001:db8::53"}), "192.0.2.53 2001:db8::53"},
         {96, code(1), code(3), "1"},
         {97, text("linux"), text("linus"), "linux"},
         {98, text("example.com"), text(""), "example.com"},
         {99, texts({"example.com", "example.org"}), texts({}), "example.com example.org"},
         {100, text("10.1.0.1"), text("10.1.0.2"), "10.1.0.1"},
         {101, text("2001:db8:1:42::1"), text("fe80::1"), "2001:db8:1:42::1"},
         {102, number(56), number(64), "56"},
         {108, text("eth0")},
         {121, text("eth0"), text("eth9"), "eth0"},
         {123, number(1), number(12), "1"},
         {186, yes(true), yes(false), "true"}});
}

HOST_TEST_F(Verify, TakesAnyOfSeveralAddressesForRight) {
    EXPECT_EQ(host.run({"ip", "-6", "address", "add", "2001:db8:2::7/64", "dev", "eth0", "nodad"}).status, 0);
    for (const char* shown : {"2001:db8:1:42::3", "2001:db8:2::7"}) {
        const Result result = verified(NodeType::ipConfig, {{27, text(shown)}, {108, text("eth0")}}, 9);
        EXPECT_EQ(result.compared, 2U);
        EXPECT_TRUE(result.differences.empty()) << shown;
    }
}

/// The driver's files, for not every kernel has bonds.
HOST_TEST(VerifyOfATeam, FindsEachWrongFact) {
    host.file("/sys/class/net/bond0/bonding/mode", "active-backup 1\n");
    host.file("/sys/class/net/bond0/bonding/slaves", "eth1 eth0\n");
    host.file("/sys/class/net/bond0/bonding/active_slave", "eth1\n");
    host.file("/sys/class/net/eth1/bonding_slave/mii_status", "going down\n");
    host.file("/sys/class/net/eth1/bonding_slave/link_failure_count", "3\n");
    host.symlink("/sys/class/net/eth1/master", "../bond0");
    Result none = verified(NodeType::team, {{197, text("bond0")}}, 9);
    ASSERT_EQ(none.differences.size(), 1U) << "there are its files, but no link";
    const auto found = [](NodeType type, unsigned int id, const PropertyValue& value, const char* name) {
        const unsigned int nameId = type == NodeType::team ? 197 : 108;
        std::string kernel = "as shown";
        for (const Difference& each : verified(type, {{id, value}, {nameId, text(name)}}, 9).differences) {
            kernel = each.kernel == "there is no such link" ? kernel : each.kernel;
        }
        return kernel;
    };
    const PropertyValue members(Texts{"eth0", "eth1"}, true);
    EXPECT_EQ(found(NodeType::team, 165, members, "bond0"), "as shown");
    EXPECT_EQ(found(NodeType::team, 165, {Texts{"eth0"}, true}, "bond0"), "eth1 eth0");
    for (const char* mode :
         {"fault-tolerance (active-backup)", "fault-tolerance (active-backup) (fail_over_mac active)"}) {
        EXPECT_EQ(found(NodeType::team, 198, text(mode), "bond0"), "as shown");
    }
    EXPECT_EQ(found(NodeType::team, 198, text("load balancing (xor)"), "bond0"),
              "fault-tolerance (active-backup)");
    struct Member {
        unsigned int id;
        PropertyValue right;
        const char* shown;
    };
    for (const Member& each : std::vector<Member>{{193, yes(true), "true"},
                                                  {194, yes(true), "true"},
                                                  {195, text("going"), "going"},
                                                  {196, number(3), "3"},
                                                  {199, text("bond0"), "bond0"}}) {
        EXPECT_EQ(found(NodeType::networkPort, each.id, each.right, "eth1"), "as shown") << each.id;
        EXPECT_EQ(found(NodeType::networkPort, each.id, text("x"), "eth1"), each.shown) << each.id;
    }
}

HOST_TEST_F(Verify, AsksForTheLinkAndOfABondWhetherItIsUp) {
    for (const char* command :
         {"link add eth1 type veth peer name sw1", "link add bond1 type veth peer name sw2",
          "link set eth1 up", "link set bond1 up"}) {
        EXPECT_EQ(host.run({"sh", "-c", std::string("ip ") + command}).status, 0);
    }
    expectEachFound(NodeType::ipConfig, {{108, text("eth1")}, {123, number(12), number(1), "12"}});
    expectEachFound(NodeType::ipConfig, {{108, text("bond1")}, {123, number(1), number(12), "1"}});
}

HOST_TEST_F(Verify, SaysWhyAFactMayBeWrong) {
    host.realTool("ethtool");
    const auto why = [](const char* name, unsigned int id) {
        const Result result = verified(NodeType::networkPort, {{id, text("wrong")}, {108, text(name)}}, 9);
        return result.differences.empty() ? "" : result.differences.back().why;
    };
    using testing::HasSubstr;
    EXPECT_THAT(why("sw0", 123), HasSubstr("see cvagent doctor"));
    EXPECT_THAT(why("sw", 123), HasSubstr("the name is part of 'sw0'"));
    EXPECT_THAT(why("sw0", 199), HasSubstr("from the interface's file"));
    EXPECT_THAT(why("bond7", 123), HasSubstr("while all its members are"));
    EXPECT_THAT(why("-x", 82), HasSubstr("no command is run with such a name"));
    EXPECT_THAT(why("$(x)", 82), HasSubstr("no command is run with such a name"));
}

HOST_TEST_F(Verify, FindsWhatIsShownOfAnInterfaceThatHasNothing) {
    host.setHostName("linux");  // of whose domain no file knows
    const PropertyValue none = text("");
    expectEachFound(NodeType::ipConfig, {{24, code(0), code(1), "0"},
                                         {25, text("0.0.0.0"), text("10.1.2.4"), "(none)"},
                                         {26, text("0.0.0.0"), text("255.0.0.0"), "(none)"},
                                         {27, none, text("2001:db8::1"), "(none)"},
                                         {28, code(2), code(7), "2"},
                                         {29, none, text("42"), ""},
                                         {47, number(4096), number(4097), "4096"},
                                         {100, none, text("10.1.0.2"), "10.1.0.1"},
                                         {101, none, text("fe80::1"), "(none)"},
                                         {102, number(0), number(64), "0"},
                                         {108, text("sw0")},
                                         {186, yes(false), yes(true), "false"}});
    EXPECT_EQ(verified(NodeType::ipConfig, {{98, text("example.com")}, {108, text("sw0")}}, 9).compared, 1U);
    const Result gone = verified(NodeType::ipConfig, {{108, text("eth9")}}, 9);
    ASSERT_EQ(gone.differences.size(), 1U);
    EXPECT_EQ(gone.differences[0].kernel, "there is no such link");
}

HOST_TEST_F(Verify, FindsEachWrongFactOfTheComputer) {
    host.setHostName("linux");
    host.symlink("/etc/localtime", "/usr/share/zoneinfo/Asia/Kolkata");
    const auto now = static_cast<unsigned int>(std::time(nullptr));
    expectEachFound(NodeType::computer, {{108, text("linux"), text("linus"), "linux"},
                                         {127, {Number(330.0), true}, {Number(60.0), true}, "330"}});
    EXPECT_TRUE(verified(NodeType::computer, {{126, number(now)}}, 9).differences.empty());
    EXPECT_EQ(verified(NodeType::computer, {{126, number(now - 60)}}, 9).differences.size(), 1U);
    EXPECT_EQ(verified(NodeType::computer, {{126, number(now + 60)}}, 9).differences.size(), 1U);
}

HOST_TEST_F(Verify, FindsAWrongClockOfAProcessor) {
    host.file("/proc/cpuinfo", "processor : 0\ncpu MHz : 2400.125\nprocessor : 1\ncpu MHz : 1200.0\n");
    const auto found = [](unsigned int megahertz, unsigned int processor) {
        return verified(NodeType::processor, {{80, number(megahertz)}}, 9, processor).differences;
    };
    EXPECT_TRUE(found(2400, 1).empty());
    EXPECT_TRUE(found(1201, 2).empty());
    ASSERT_EQ(found(1200, 1).size(), 1U);
    EXPECT_EQ(found(1200, 1)[0].kernel, "2400");
    EXPECT_EQ(found(2400, 2).size(), 1U);
    EXPECT_EQ(found(2400, 3)[0].kernel, "(none)");
}

/// Of another plug-in's tree nothing is said.
HOST_TEST_F(Verify, CountsTheProcessorsOfAPlanar) {
    const auto counted = [](unsigned int planars, unsigned int processors) {
        NodeList list;
        for (unsigned int i = 0; i < planars; ++i) {
            list.add(static_cast<unsigned int>(NodeType::planar), 0);
        }
        for (unsigned int i = 0; i < processors; ++i) {
            list.add(static_cast<unsigned int>(NodeType::processor), 1, i + 1);
        }
        return cvagent::verify::verify(list.nodes(), std::vector<std::vector<Reading>>(list.nodes().size()));
    };
    const auto online = static_cast<unsigned int>(sysconf(_SC_NPROCESSORS_ONLN));
    EXPECT_EQ(counted(1, online).compared, 1U);
    EXPECT_TRUE(counted(1, online).differences.empty());
    ASSERT_EQ(counted(1, online + 1).differences.size(), 1U);
    EXPECT_EQ(counted(1, online + 1).differences[0].kernel, std::to_string(online));
    EXPECT_EQ(counted(0, 0).compared, 0U);
}

TEST(LinkModes, AreThoseThatThePlugInKnowsByTheFirst) {
    const auto first = [](const std::vector<unsigned>& bits) {
        const auto mode = cvagent::verify::firstLinkMode(
            [&bits](unsigned bit) { return std::find(bits.begin(), bits.end(), bit) != bits.end(); });
        return std::vector<unsigned>{mode.megabits, mode.portType};
    };
    using Told = std::vector<unsigned>;
    EXPECT_EQ(first({}), (Told{0, 0}));
    EXPECT_EQ(first({0, 1, 2, 3, 5, 6, 7}), (Told{10, 50}));
    EXPECT_EQ(first({3, 5}), (Told{100, 52}));
    EXPECT_EQ(first({5, 6, 47}), (Told{1000, 53}));
    EXPECT_EQ(first({6, 7, 13, 12, 48}), (Told{10000, 0}));
    EXPECT_EQ(first({47, 48, 51}), (Told{2500, 54}));
    EXPECT_EQ(first({10, 16, 17, 47}), (Told{0, 0})) << "1000baseKX comes first";
    EXPECT_EQ(first({49, 74, 99}), (Told{10, 0}));
}

}  // namespace
