// The files of the systems that keep interfaces: as few lines changed as the wish takes.
#include <gmock/gmock.h>

#include "agent/keep/ifcfg_editor.h"
#include "agent/keep/interfaces_file.h"
#include "agent/keep/netplan_file.h"
#include "agent/keep/network_file.h"
#include "agent/keep/stanza_editor.h"

namespace {

using cvagent::keep::CannotKeep;
using cvagent::keep::editedIfcfg;
using cvagent::keep::editedIfroute;
using cvagent::keep::editedNetplan;
using cvagent::keep::editedStanza;
using cvagent::keep::ownNetworkFile;
using cvagent::keep::ownNetworkPath;
using cvagent::keep::Wish;
using testing::HasSubstr;

Wish address(const std::string& text) {
    Wish wish;
    wish.ipv4.address = text;
    return wish;
}
Wish prefix(unsigned bits) {
    Wish wish;
    wish.ipv4.prefix = bits;
    return wish;
}
Wish gateway(const std::string& text) {
    Wish wish;
    wish.ipv4.gateway = text;
    return wish;
}
Wish origin(bool dhcp) {
    Wish wish;
    wish.dhcp = dhcp;
    return wish;
}
Wish whole(const std::string& text, unsigned bits) {
    Wish wish = address(text);
    wish.ipv4.prefix = bits;
    return wish;
}
Wish ipv6(const std::string& text, unsigned bits, const std::string& router = {}) {
    Wish wish;
    wish.ipv6.address = text;
    wish.ipv6.prefix = bits;
    if (!router.empty()) {
        wish.ipv6.gateway = router;
    }
    return wish;
}
Wish names(const std::vector<std::string>& servers, const std::vector<std::string>& domains) {
    Wish wish;
    wish.nameServers = servers;
    wish.searchDomains = domains;
    return wish;
}

/// What a function says that cannot keep something; "" when it can.
template <class Edit>
std::string refusal(const Edit& edit) {
    try {
        edit();
        return "";
    } catch (const CannotKeep& cannot) {
        return cannot.what();
    }
}

constexpr const char* kBefore = "# the wire\nauto eth0\n";
constexpr const char* kAfter = "\n# the other\niface eth1 inet static\n\taddress 198.51.100.1/24\n";

std::string stanza(const std::string& text, const Wish& wish) {
    const std::string edited = editedStanza(kBefore + text + kAfter, "eth0", wish);
    EXPECT_TRUE(edited.starts_with(kBefore) && edited.ends_with(kAfter)) << edited;
    const std::size_t begin = std::string(kBefore).size();
    return edited.substr(begin, edited.size() - begin - std::string(kAfter).size());
}

TEST(StanzaEditor, ChangesTheLineThatItIsAbout) {
    EXPECT_EQ(stanza("iface eth0 inet static\n  address  192.0.2.10/24\n  # x\n  gateway 192.0.2.1\n",
                     address("192.0.2.77")),
              "iface eth0 inet static\n  address  192.0.2.77/24\n  # x\n  gateway 192.0.2.1\n");
    EXPECT_EQ(stanza("iface eth0 inet static\n\taddress 192.0.2.10\n\tnetmask 255.255.255.0\n", prefix(25)),
              "iface eth0 inet static\n\taddress 192.0.2.10\n\tnetmask 255.255.255.128\n");
    EXPECT_EQ(stanza("iface eth0 inet static\n\taddress 192.0.2.10\n\tnetmask 24\n", whole("192.0.2.7", 25)),
              "iface eth0 inet static\n\taddress 192.0.2.7\n\tnetmask 25\n");
    EXPECT_EQ(stanza("iface eth0 inet static\n\taddress 192.0.2.10/24\n", gateway("192.0.2.1")),
              "iface eth0 inet static\n\taddress 192.0.2.10/24\n\tgateway 192.0.2.1\n");
    EXPECT_EQ(stanza("iface eth0 inet static\n\taddress 192.0.2.10/24\n\tgateway 192.0.2.1\n", gateway("")),
              "iface eth0 inet static\n\taddress 192.0.2.10/24\n");
}

TEST(StanzaEditor, TakesWhatFollowsFromTheOldAddressAway) {
    EXPECT_EQ(stanza("iface eth0 inet static\n address 192.0.2.10/24\n network 192.0.2.0\n"
                     " broadcast 192.0.2.255\n up true\n",
                     address("198.51.100.10")),
              "iface eth0 inet static\n address 198.51.100.10/24\n up true\n");
}

TEST(StanzaEditor, ChangesNothingThatIsSoAlready) {
    const std::string text =
        "iface eth0 inet static\n  address 192.0.2.10/24   \n  gateway\t192.0.2.1\n  dns-search a  b\n";
    for (const Wish& wish : {address("192.0.2.10"), prefix(24), gateway("192.0.2.1"), origin(false),
                             names({}, {"a", "b"}), Wish{}}) {
        EXPECT_EQ(stanza(text, wish), text);
    }
}

TEST(StanzaEditor, ChangesTheMethod) {
    EXPECT_EQ(stanza("iface eth0 inet static\n  address 192.0.2.10/24\n  gateway 192.0.2.1\n  mtu 1400\n",
                     origin(true)),
              "iface eth0 inet dhcp\n  mtu 1400\n");
    Wish wish = whole("192.0.2.10", 24);
    wish.dhcp = false;
    EXPECT_EQ(stanza("iface eth0  inet\tdhcp \n", wish),
              "iface eth0  inet\tstatic \n    address 192.0.2.10/24\n");
}

TEST(StanzaEditor, HasAStanzaForEachFamily) {
    EXPECT_EQ(stanza("iface eth0 inet dhcp\niface eth0 inet6 static\n  address 2001:db8::1/64\n",
                     ipv6("2001:db8::2", 48, "fe80::1")),
              "iface eth0 inet dhcp\niface eth0 inet6 static\n  address 2001:db8::2/48\n  gateway fe80::1\n");
}

TEST(StanzaEditor, WritesNameServersForResolvconf) {
    EXPECT_EQ(stanza("iface eth0 inet dhcp\n  dns-nameservers 192.0.2.53\n",
                     names({"192.0.2.54", "2001:db8::53"}, {"a.example", "b.example"})),
              "iface eth0 inet dhcp\n  dns-nameservers 192.0.2.54 2001:db8::53\n"
              "  dns-search a.example b.example\n");
    EXPECT_EQ(stanza("iface eth0 inet dhcp\n  dns-nameservers 192.0.2.53\n  dns-search a\n", names({}, {})),
              "iface eth0 inet dhcp\n");
}

/// Whatever counts as a blank to who reads the file.
TEST(StanzaEditor, FindsAValueBehindAnyBlank) {
    EXPECT_EQ(stanza("iface eth0 inet static\n address\v 192.0.2.1/24\n gateway\n", gateway("192.0.2.1")),
              "iface eth0 inet static\n address\v 192.0.2.1/24\n gateway 192.0.2.1\n");
    EXPECT_EQ(stanza("iface eth0 inet static\n address\v 192.0.2.1/24\n", address("192.0.2.2")),
              "iface eth0 inet static\n address\v 192.0.2.2/24\n");
}

/// What a command goes on with in the next line is no option of the stanza.
TEST(StanzaEditor, LeavesTheRestOfALongLineAlone) {
    const std::string command = " up logger \\\n gateway 192.0.2.9\n";
    EXPECT_EQ(stanza("iface eth0 inet static\n address 192.0.2.1/24\n" + command, gateway("192.0.2.1")),
              "iface eth0 inet static\n address 192.0.2.1/24\n" + command + " gateway 192.0.2.1\n");
    EXPECT_EQ(stanza("iface eth0 inet static\n address 192.0.2.1/24\n" + command, gateway("")),
              "iface eth0 inet static\n address 192.0.2.1/24\n" + command);
}

/// A mask that stands beside a prefix length counts.
TEST(StanzaEditor, HasTheMaskAsLongAsThePrefix) {
    EXPECT_EQ(stanza("iface eth0 inet static\n address 192.0.2.1/24\n netmask 255.255.255.0\n", prefix(25)),
              "iface eth0 inet static\n address 192.0.2.1/25\n netmask 255.255.255.128\n");
}

TEST(StanzaEditor, KeepsTheEndOfAFileWithoutALineBreak) {
    EXPECT_EQ(editedStanza("iface eth0 inet static\n address 192.0.2.1/24", "eth0", address("192.0.2.2")),
              "iface eth0 inet static\n address 192.0.2.2/24");
}

TEST(StanzaEditor, RefusesWhatItDoesNotUnderstand) {
    const auto refused = [](const std::string& text, const Wish& wish) {
        return refusal([&] { editedStanza(text, "eth0", wish); });
    };
    const Wish wish = address("192.0.2.2");
    const std::string head = "iface eth0 inet static\n";
    EXPECT_THAT(refused("", wish), HasSubstr("no stanza"));
    EXPECT_THAT(refused("# iface eth0 inet static\n", wish), HasSubstr("no stanza"));
    EXPECT_THAT(refused("iface eth0:1 inet static\niface eth0 inet6 static\niface eth* inet static\n", wish),
                HasSubstr("no stanza"));
    EXPECT_THAT(refused(head + " address 192.0.2.1/24\n" + head + " address 192.0.2.3/24\n", wish),
                HasSubstr("more than one stanza"));
    EXPECT_THAT(refused("iface eth0 inet static inherits base\n address 192.0.2.1/24\n", wish),
                HasSubstr("elsewhere"));
    EXPECT_THAT(refused("iface eth0 inet \\\nstatic\n address 192.0.2.1/24\n", wish), HasSubstr("elsewhere"));
    EXPECT_THAT(refused("iface eth0 inet dhcp\n", wish), HasSubstr("'dhcp', not static"));
    EXPECT_THAT(refused("iface eth0 inet manual\n", origin(true)), HasSubstr("'manual'"));
    EXPECT_THAT(refused("iface eth0 inet dhcp\n", origin(false)), HasSubstr("no address"));
    EXPECT_THAT(refused(head, wish), HasSubstr("no mask"));
    EXPECT_THAT(refused(head + " address 192.0.2.1\n netmask 255.0.255.0\n", wish), HasSubstr("no mask"));
    EXPECT_THAT(refused("iface eth0 inet6 static\n address ::1\n netmask 255.0.0.0\n", ipv6("::2", 64)), "");
    EXPECT_THAT(refused(head + " address one.example/24\n", wish), HasSubstr("not understood"));
    EXPECT_THAT(refused(head + " address 192.0.2.1/24\n address 192.0.2.3/24\n", wish),
                HasSubstr("not one line"));
    EXPECT_THAT(refused(head + " address \\\n 192.0.2.1/24\n", wish), HasSubstr("not one line"));
    // A line more would be the rest of the last one.
    EXPECT_THAT(refused(head + " address 192.0.2.1/24\n up true \\", names({"192.0.2.53"}, {})),
                HasSubstr("in the middle of a line"));
    EXPECT_THAT(refused(head + " address 192.0.2.1/24\n up true \\\n# all\\\n", gateway("192.0.2.2")),
                HasSubstr("in the middle of a line"));
}

/// Values are checked long before; here it is for who comes another way.
TEST(Wishes, AreAddressesAndDomainsAndNothingElse) {
    const std::string text = "iface eth0 inet static\n address 192.0.2.1/24\n";
    const auto refused = [&text](const Wish& wish) {
        return refusal([&] { editedStanza(text, "eth0", wish); });
    };
    for (const char* hostile : {"", "192.0.2", "192.0.2.1/24", "192.0.2.1\n up touch /tmp/x", "::1",
                                "0.0.0.0", "192.0.2.1 ", "$(x)", "0x7f.1"}) {
        EXPECT_THAT(refused(address(hostile)), HasSubstr("no address")) << hostile;
    }
    EXPECT_THAT(refused(ipv6("0::0", 64)), HasSubstr("no address"));
    EXPECT_THAT(refused(gateway("192.0.2.1\n\tup x")), HasSubstr("no address"));
    EXPECT_THAT(refused(prefix(0)), HasSubstr("no prefix length"));
    EXPECT_THAT(refused(prefix(33)), HasSubstr("no prefix length"));
    EXPECT_THAT(refused(names({"192.0.2.53", "one"}, {})), HasSubstr("no address"));
    for (const char* hostile : {"", "a b", "a\nup x", "a'", "\xc3\xa9", "-x", "~a", "a;b"}) {
        EXPECT_THAT(refused(names({}, {hostile})), HasSubstr("no domain")) << hostile;
    }
    for (const char* hostile :
         {"", "-x", "a b", "a*", "!a", "a/b", "..", "a\n", "a$(x)", "0123456789abcdef", "a;"}) {
        EXPECT_THAT(refusal([&] { cvagent::keep::checkName(hostile); }), HasSubstr("written to no file"))
            << hostile;
    }
    cvagent::keep::checkName("br-0.4_x@y");
}

std::string network(const std::string& text, const Wish& wish) {
    const std::string head = std::string(cvagent::keep::kOurMark) + "[Match]\nName=eth0\n\n";
    const std::string edited = ownNetworkFile("[Match]\nName=e*\n" + text, "eth0", wish);
    EXPECT_TRUE(edited.starts_with(head)) << edited;
    // What is ours already is edited once more to the same.
    EXPECT_EQ(ownNetworkFile(edited, "eth0", wish), edited);
    return edited.substr(head.size());
}

TEST(NetworkFile, IsTheOneThatIsInForceWithTheChange) {
    EXPECT_EQ(network("\n[Network]\nAddress=192.0.2.10/24\nAddress=198.51.100.1/24\nGateway=192.0.2.1\n",
                      address("192.0.2.77")),
              "[Network]\nAddress=192.0.2.77/24\nAddress=198.51.100.1/24\nGateway=192.0.2.1\n");
    EXPECT_EQ(network("[Network]\nDHCP=no\n# x\n[Address]\nAddress = 192.0.2.10/24\nLabel=a\n", prefix(25)),
              "[Network]\nDHCP=no\n# x\n[Address]\nAddress=192.0.2.10/25\nLabel=a\n");
    EXPECT_EQ(network("[Network]\nDHCP=ipv6\n\n[Link]\nMTUBytes=1400\n", whole("192.0.2.7", 24)),
              "[Network]\nDHCP=ipv6\nAddress=192.0.2.7/24\n\n[Link]\nMTUBytes=1400\n");
    EXPECT_EQ(network("[Network]\nAddress=fe80::5/64\nAddress=2001:db8::1/64\n",
                      ipv6("2001:db8::2", 48, "fe80::1")),
              "[Network]\nAddress=fe80::5/64\nAddress=2001:db8::2/48\nGateway=fe80::1\n");
    EXPECT_EQ(network("[Link]\nMTUBytes=1400\n", whole("192.0.2.7", 24)),
              "[Link]\nMTUBytes=1400\n[Network]\nAddress=192.0.2.7/24\n");
}

TEST(NetworkFile, HasTheGatewayWhereItStands) {
    const std::string routes =
        "[Route]\nDestination=10.0.0.0/8\nGateway=192.0.2.9\n[Route]\nGateway=192.0.2.1\nMetric=7\n";
    EXPECT_EQ(network("[Network]\nAddress=192.0.2.10/24\n" + routes, gateway("192.0.2.2")),
              "[Network]\nAddress=192.0.2.10/24\n[Route]\nDestination=10.0.0.0/8\nGateway=192.0.2.9\n"
              "[Route]\nGateway=192.0.2.2\nMetric=7\n");
    EXPECT_EQ(network("[Network]\nAddress=192.0.2.10/24\n" + routes, gateway("")),
              "[Network]\nAddress=192.0.2.10/24\n[Route]\nDestination=10.0.0.0/8\nGateway=192.0.2.9\n");
}

TEST(NetworkFile, ChangesTheOriginOfIpv4Alone) {
    EXPECT_EQ(network("[Network]\nDHCP=yes\nAddress=192.0.2.10/24\n", origin(false)),
              "[Network]\nAddress=192.0.2.10/24\nDHCP=ipv6\n");
    EXPECT_EQ(network("[Network]\nDHCP=true\n", origin(true)), "[Network]\nDHCP=true\n");
    EXPECT_EQ(network("[Network]\nAddress=192.0.2.10/24\nAddress=2001:db8::1/64\nGateway=192.0.2.1\n"
                      "[Address]\nAddress=192.0.2.11/24\nLabel=b\n",
                      origin(true)),
              "[Network]\nAddress=2001:db8::1/64\nDHCP=ipv4\n");
    Wish wish = whole("192.0.2.7", 24);
    wish.dhcp = false;
    EXPECT_EQ(network("[Network]\nDHCP=ipv4\n", wish), "[Network]\nDHCP=no\nAddress=192.0.2.7/24\n");
}

/// A lease takes its gateway along; without one the host would be in its subnet alone after a restart.
Wish insteadOfLease() {
    Wish wish = whole("192.0.2.7", 24);
    wish.dhcp = false;
    wish.ipv4.likelyGateway = "192.0.2.1";
    return wish;
}

TEST(NetworkFile, HasTheGatewayThatCameByDhcp) {
    EXPECT_EQ(network("[Network]\nDHCP=ipv4\n", insteadOfLease()),
              "[Network]\nDHCP=no\nAddress=192.0.2.7/24\nGateway=192.0.2.1\n");
    EXPECT_EQ(network("[Network]\nAddress=192.0.2.10/24\n", insteadOfLease()),
              "[Network]\nAddress=192.0.2.7/24\n");
    Wish wish = insteadOfLease();
    wish.ipv4.gateway = "192.0.2.2";
    EXPECT_EQ(network("[Network]\nDHCP=ipv4\n", wish),
              "[Network]\nDHCP=no\nAddress=192.0.2.7/24\nGateway=192.0.2.2\n");
}

TEST(StanzaEditor, HasTheGatewayThatCameByDhcp) {
    EXPECT_EQ(editedStanza("iface eth0 inet dhcp\n", "eth0", insteadOfLease()),
              "iface eth0 inet static\n    address 192.0.2.7/24\n    gateway 192.0.2.1\n");
    EXPECT_EQ(editedStanza("iface eth0 inet static\n address 192.0.2.9/24\n", "eth0", insteadOfLease()),
              "iface eth0 inet static\n address 192.0.2.7/24\n");
}

TEST(IfcfgEditor, KnowsWhetherTheAddressComesByDhcp) {
    using cvagent::keep::isIfcfgByDhcp;
    for (const char* text :
         {"BOOTPROTO='dhcp'\n", "BOOTPROTO=dhcp4\n", "BOOTPROTO=static\nBOOTPROTO=dhcp\n"}) {
        EXPECT_TRUE(isIfcfgByDhcp(text)) << text;
    }
    for (const char* text : {"", "BOOTPROTO=static\n", "BOOTPROTO=dhcp6\n", "#BOOTPROTO=dhcp\n"}) {
        EXPECT_FALSE(isIfcfgByDhcp(text)) << text;
    }
}

/// Names of links can change places at a restart, and a file can be about one of several networks.
TEST(NetworkFile, IsForTheSameLinkOnly) {
    EXPECT_EQ(ownNetworkFile("[Match]\nMACAddress = 02:00:00:aa:bb:01\nName=e*\n# x\nSSID=a b\n"
                             "[Network]\nAddress=192.0.2.10/24\n",
                             "eth0", address("192.0.2.77")),
              std::string(cvagent::keep::kOurMark) +
                  "[Match]\nName=eth0\nMACAddress=02:00:00:aa:bb:01\nSSID=a b\n\n"
                  "[Network]\nAddress=192.0.2.77/24\n");
}

/// It follows from the address, and would be that of the old one.
TEST(NetworkFile, HasNoBroadcastAddressOfAnotherSubnet) {
    EXPECT_EQ(network("[Address]\nAddress=192.0.2.10/24\nBroadcast=192.0.2.255\nLabel=a\n"
                      "[Address]\nAddress=192.0.2.11/24\nBroadcast=192.0.2.255\n",
                      whole("198.51.100.7", 25)),
              "[Address]\nAddress=198.51.100.7/25\nLabel=a\n"
              "[Address]\nAddress=192.0.2.11/24\nBroadcast=192.0.2.255\n");
    EXPECT_EQ(network("[Address]\nAddress=192.0.2.10/24\nBroadcast=no\n", address("192.0.2.11")),
              "[Address]\nAddress=192.0.2.11/24\nBroadcast=no\n");
}

TEST(NetworkFile, LeavesTheWayToAPeerAlone) {
    EXPECT_THAT(refusal([] {
                    ownNetworkFile("[Address]\nAddress=192.0.2.10/32\nPeer=192.0.2.1/32\n", "eth0",
                                   address("192.0.2.11"));
                }),
                HasSubstr("Peer"));
}

TEST(NetworkFile, HasNoGatewayLeftWhereNoneIsWanted) {
    EXPECT_EQ(
        network("[Network]\nAddress=192.0.2.10/24\nGateway=192.0.2.1\n[Route]\nGateway=192.0.2.9\nMetric=7\n",
                gateway("")),
        "[Network]\nAddress=192.0.2.10/24\n");
}

TEST(NetworkFile, LeavesGatewaysOfOtherTablesAlone) {
    const std::string other = "[Route]\nGateway=192.0.2.9\nTable=100\n";
    EXPECT_EQ(network("[Network]\nAddress=192.0.2.10/24\n" + other, gateway("192.0.2.2")),
              "[Network]\nAddress=192.0.2.10/24\nGateway=192.0.2.2\n" + other);
}

TEST(NetworkFile, HasNameServersAndDomains) {
    EXPECT_EQ(network("[Network]\nDNS=192.0.2.53\nDNS=192.0.2.54\nDomains=old ~corp.example\n",
                      names({"2001:db8::53"}, {"new.example"})),
              "[Network]\nDNS=2001:db8::53\nDomains=new.example ~corp.example\n");
    EXPECT_EQ(network("[Network]\nDNS=192.0.2.53\nDomains=old\nLLDP=yes\n", names({}, {})),
              "[Network]\nLLDP=yes\n");
}

TEST(NetworkFile, IsNotMadeOfWhatIsNotUnderstood) {
    const auto refused = [](const std::string& text, const Wish& wish) {
        return refusal([&] { ownNetworkFile(text, "eth0", wish); });
    };
    EXPECT_THAT(refused("[Network]\nAddress=\\\n192.0.2.1/24\n", address("192.0.2.2")),
                HasSubstr("goes on in the next"));
    EXPECT_THAT(refused("[Network]\nwhat\n", address("192.0.2.2")), HasSubstr("not understood: 'what'"));
    EXPECT_THAT(refused("[Network]\nDHCP=perhaps\n", address("192.0.2.2")), HasSubstr("'perhaps'"));
    EXPECT_THAT(refused("[Network]\nDHCP=yes\n", address("192.0.2.2")), HasSubstr("comes by DHCP"));
    EXPECT_THAT(refused("[Network]\n", address("192.0.2.2")), HasSubstr("no mask"));
    EXPECT_THAT(refused("[Network]\n", prefix(24)), HasSubstr("no address"));
    EXPECT_THAT(refused("[Network]\nDHCP=yes\n", origin(false)), HasSubstr("no address would be left"));
    EXPECT_THAT(refusal([] { ownNetworkFile("", "e*", Wish{}); }), HasSubstr("written to no file"));
}

TEST(NetworkFile, SortsBeforeTheOneInForce) {
    const std::string ours = "/etc/systemd/network/0-cvagent-eth0.network";
    for (const char* source :
         {"/etc/systemd/network/00-a.network", "/run/systemd/network/10-netplan-e.network",
          "/usr/lib/systemd/network/a.network"}) {
        EXPECT_EQ(ownNetworkPath(source, "eth0"), ours);
    }
    EXPECT_EQ(ownNetworkPath(ours, "eth0"), ours);
    for (const char* source : {"/etc/systemd/network/-.network", "/etc/systemd/network/0-a.network"}) {
        EXPECT_THAT(refusal([&] { ownNetworkPath(source, "eth0"); }), HasSubstr("sorts before")) << source;
    }
}

TEST(IfcfgEditor, ChangesTheLineThatItIsAbout) {
    EXPECT_EQ(editedIfcfg("BOOTPROTO='static'\n# x\nIPADDR='192.0.2.10/24'\nSTARTMODE='auto'\n",
                          address("192.0.2.77")),
              "BOOTPROTO='static'\n# x\nIPADDR='192.0.2.77/24'\nSTARTMODE='auto'\n");
    EXPECT_EQ(editedIfcfg("IPADDR=192.0.2.10\nNETMASK=255.255.255.0\nBROADCAST=192.0.2.255\n",
                          whole("192.0.2.7", 25)),
              "IPADDR='192.0.2.7'\nNETMASK='255.255.255.128'\n");
    EXPECT_EQ(editedIfcfg("IPADDR=\"192.0.2.10\"\nPREFIXLEN=\"24\"\n", prefix(25)),
              "IPADDR=\"192.0.2.10\"\nPREFIXLEN='25'\n");
    for (const char* text : {"BOOTPROTO='dhcp'\n", "BOOTPROTO=dhcp4\n"}) {
        EXPECT_EQ(editedIfcfg(text, origin(true)), text);
    }
    EXPECT_EQ(editedIfcfg("BOOTPROTO=dhcp\nIPADDR=192.0.2.1/24\n", origin(false)),
              "BOOTPROTO='static'\nIPADDR=192.0.2.1/24\n");
    EXPECT_EQ(editedIfcfg("", whole("192.0.2.7", 24)), "IPADDR='192.0.2.7/24'\n");
}

TEST(IfcfgEditor, HasAKeyForEachAddress) {
    EXPECT_EQ(editedIfcfg("IPADDR='192.0.2.10/24'\nIPADDR_6='2001:db8::1/64'\n", ipv6("2001:db8::2", 48)),
              "IPADDR='192.0.2.10/24'\nIPADDR_6='2001:db8::2/48'\n");
    EXPECT_EQ(editedIfcfg("IPADDR='192.0.2.10/24'\nIPADDR_1='192.0.2.11/24'\n", ipv6("2001:db8::2", 48)),
              "IPADDR='192.0.2.10/24'\nIPADDR_1='192.0.2.11/24'\nIPADDR_cvagent='2001:db8::2/48'\n");
    EXPECT_EQ(editedIfcfg("IPADDR='2001:db8::1/64'\n", whole("192.0.2.7", 24)),
              "IPADDR='2001:db8::1/64'\nIPADDR_1='192.0.2.7/24'\n");
}

/// Of a key that stands twice the last one counts.
TEST(IfcfgEditor, LeavesOneLineOfAKey) {
    EXPECT_EQ(editedIfcfg("IPADDR='192.0.2.10/24'\nA=b\nIPADDR='192.0.2.11/24'\n", address("192.0.2.12")),
              "IPADDR='192.0.2.12/24'\nA=b\n");
}

TEST(IfcfgEditor, RefusesWhatItDoesNotUnderstand) {
    EXPECT_THAT(refusal([] { editedIfcfg("IPADDR=$(x)\n", address("192.0.2.2")); }),
                HasSubstr("not understood"));
    EXPECT_THAT(refusal([] { editedIfcfg("", address("192.0.2.2")); }), HasSubstr("no mask"));
    EXPECT_THAT(refusal([] { editedIfcfg("BOOTPROTO=dhcp\n", origin(false)); }), HasSubstr("no address"));
    EXPECT_THAT(refusal([] { editedIfcfg("BOOTPROTO=dhcp4+static\n", origin(true)); }),
                HasSubstr("not understood"));
}

TEST(IfrouteEditor, HasOneDefaultRouteOfAFamily) {
    EXPECT_EQ(editedIfroute("10.0.0.0/8 192.0.2.9 - -\ndefault fe80::1 - eth0\n", gateway("192.0.2.1")),
              "10.0.0.0/8 192.0.2.9 - -\ndefault fe80::1 - eth0\ndefault 192.0.2.1 - -\n");
    EXPECT_EQ(editedIfroute("default 192.0.2.1 - eth0\n", gateway("192.0.2.1")),
              "default 192.0.2.1 - eth0\n");
    EXPECT_EQ(editedIfroute("default 192.0.2.1 - eth0 metric 7\nx\n", gateway("192.0.2.2")),
              "default 192.0.2.2 - eth0 metric 7\nx\n");
    EXPECT_EQ(editedIfroute("0.0.0.0/0\t192.0.2.1 # home\n::/0 fe80::1 - -\n", gateway("192.0.2.2")),
              "0.0.0.0/0\t192.0.2.2 # home\n::/0 fe80::1 - -\n");
    EXPECT_EQ(editedIfroute("default 192.0.2.1 - eth0\nx\n", gateway("")), "x\n");
}

constexpr const char* kNetplan =
    "# the host\nnetwork:\n  version: 2\n  renderer: networkd\n  ethernets:\n    eth1:\n      dhcp4: true\n"
    "    \"eth0\":\n      match: {macaddress: \"02:00:00:aa:bb:01\"}\n";
constexpr const char* kNetplanEnd =
    "    eth2: {dhcp4: true}  # another\n  bridges:\n    br0:\n      dhcp4: no\n";

/// The lines of eth0 behind the change.
std::string netplan(const std::string& text, const Wish& wish) {
    const std::string edited = editedNetplan(kNetplan + text + kNetplanEnd, "eth0", wish);
    EXPECT_TRUE(edited.starts_with(kNetplan) && edited.ends_with(kNetplanEnd)) << edited;
    EXPECT_EQ(editedNetplan(edited, "eth0", wish), edited);
    const std::size_t begin = std::string(kNetplan).size();
    return edited.substr(begin, edited.size() - begin - std::string(kNetplanEnd).size());
}

TEST(NetplanFile, ChangesTheValueThatItIsAbout) {
    EXPECT_EQ(
        netplan("      addresses: [192.0.2.10/24, \"2001:db8::1/64\"]  # ours\n", address("192.0.2.77")),
        "      addresses: [192.0.2.77/24, \"2001:db8::1/64\"]  # ours\n");
    EXPECT_EQ(netplan("      addresses:\n      - 198.51.100.1/24\n      - '2001:db8::1/64'\n",
                      ipv6("2001:db8::2", 48)),
              "      addresses:\n      - 198.51.100.1/24\n      - '2001:db8::2/48'\n");
    EXPECT_EQ(netplan("      addresses:\n        - \"192.0.2.10/24\":\n            label: a\n\n        # x\n",
                      prefix(25)),
              "      addresses:\n        - \"192.0.2.10/25\":\n            label: a\n\n        # x\n");
    EXPECT_EQ(netplan("      addresses: [192.0.2.10/24]\n      gateway4: 192.0.2.1\n", gateway("192.0.2.2")),
              "      addresses: [192.0.2.10/24]\n      gateway4: 192.0.2.2\n");
}

/// A value can stand in a comment, too, and be a part of another one.
TEST(NetplanFile, ChangesTheValueWhereItStands) {
    EXPECT_EQ(
        netplan("      addresses:\n      - 192.0.2.10/24  # not 192.0.2.10/24\n", address("192.0.2.77")),
        "      addresses:\n      - 192.0.2.77/24  # not 192.0.2.10/24\n");
    EXPECT_EQ(netplan("      addresses: [\"2001:1.1.1.1/8\", 1.1.1.1/8]\n", prefix(9)),
              "      addresses: [\"2001:1.1.1.1/8\", 1.1.1.1/9]\n");
    EXPECT_EQ(
        netplan("      nameservers:\n        addresses: [192.0.2.53]\n      addresses: [192.0.2.10/24]\n",
                address("192.0.2.77")),
        "      nameservers:\n        addresses: [192.0.2.53]\n      addresses: [192.0.2.77/24]\n");
    EXPECT_EQ(netplan("      gateway4: 192.0.2.1  # 192.0.2.1\n", gateway("192.0.2.2")),
              "      gateway4: 192.0.2.2  # 192.0.2.1\n");
    EXPECT_EQ(netplan("      addresses: [192.0.2.10/24\xd1, 192.0.2.10/24]\n", prefix(25)),
              "      addresses: [192.0.2.10/24\xd1, 192.0.2.10/25]\n");
}

TEST(NetplanFile, HasAPlaceForWhatIsNew) {
    EXPECT_EQ(netplan("      mtu: 1400\n", whole("192.0.2.7", 24)),
              "      mtu: 1400\n      addresses: [\"192.0.2.7/24\"]\n");
    EXPECT_EQ(netplan("      addresses: [192.0.2.7/24]\n", ipv6("2001:db8::2", 48)),
              "      addresses: [192.0.2.7/24, \"2001:db8::2/48\"]\n");
    EXPECT_EQ(netplan("      addresses: []\n", whole("192.0.2.7", 24)),
              "      addresses: [\"192.0.2.7/24\"]\n");
    EXPECT_EQ(netplan("      addresses:\n      - 192.0.2.7/24\n      mtu: 1400\n", ipv6("2001:db8::2", 48)),
              "      addresses:\n      - 192.0.2.7/24\n      - \"2001:db8::2/48\"\n      mtu: 1400\n");
    EXPECT_EQ(netplan("      mtu: 1400\n", gateway("192.0.2.1")),
              "      mtu: 1400\n      routes:\n        - to: default\n          via: \"192.0.2.1\"\n");
}

TEST(NetplanFile, HasTheDefaultRouteAmongOthers) {
    const std::string other = "      routes:\n        - to: 10.0.0.0/8\n          via: 192.0.2.9\n";
    EXPECT_EQ(netplan(other + "        - via: 192.0.2.1\n          to: 0.0.0.0/0\n", gateway("192.0.2.2")),
              other + "        - via: 192.0.2.2\n          to: 0.0.0.0/0\n");
    EXPECT_EQ(netplan(other, gateway("192.0.2.2")),
              other + "        - to: default\n          via: \"192.0.2.2\"\n");
    EXPECT_EQ(
        netplan("      routes:\n      - {to: default, via: 192.0.2.1, metric: 5}\n", gateway("192.0.2.2")),
        "      routes:\n      - {to: default, via: 192.0.2.2, metric: 5}\n");
    EXPECT_EQ(netplan("      routes:\n      - to: default\n        via: \"fe80::1\"\n", gateway("192.0.2.2")),
              "      routes:\n      - to: default\n        via: \"fe80::1\"\n"
              "      - to: default\n        via: \"192.0.2.2\"\n");
}

TEST(NetplanFile, LeavesGatewaysOfOtherTablesAlone) {
    const std::string other =
        "      routes:\n        - to: default\n          via: 192.0.2.9\n          table: 100\n";
    EXPECT_EQ(netplan(other, gateway("192.0.2.2")),
              other + "        - to: default\n          via: \"192.0.2.2\"\n");
}

TEST(NetplanFile, KnowsTheMainTableByItsNumber) {
    EXPECT_EQ(
        netplan("      routes:\n        - to: default\n          via: 192.0.2.9\n          table: 254\n",
                gateway("192.0.2.2")),
        "      routes:\n        - to: default\n          via: 192.0.2.2\n          table: 254\n");
}

TEST(NetplanFile, LeavesCommentsAsTheyAre) {
    const std::string comment = "      # \tC:\\ \"x [ 'y\n";
    EXPECT_EQ(netplan(comment + "      addresses: [192.0.2.10/24]  # \\\t{\n", address("192.0.2.77")),
              comment + "      addresses: [192.0.2.77/24]  # \\\t{\n");
}

/// What is told goes to the history and to who asks on the bus.
TEST(NetplanFile, TellsNoPasswords) {
    for (const char* line :
         {"          password: \"se\\cret\"\n", "          - \"secret\n", "          secret\n",
          "          password: [secret\n", "          \"password\": *secret\n"}) {
        const std::string told = refusal([&] {
            editedNetplan(std::string("network:\n  wifis:\n    w:\n      auth:\n") + line, "eth0", Wish{});
        });
        EXPECT_THAT(told, HasSubstr("not understood")) << line;
        EXPECT_THAT(told, testing::Not(HasSubstr("ret"))) << line;
    }
}

TEST(NetplanFile, ChangesTheOrigin) {
    EXPECT_EQ(netplan("      dhcp4: no\n", origin(true)), "      dhcp4: true\n");
    EXPECT_EQ(netplan("      dhcp4: yes  # lab\n", origin(true)), "      dhcp4: yes  # lab\n");
    EXPECT_EQ(
        netplan("      dhcp4: True\n", insteadOfLease()),
        "      dhcp4: false\n      addresses: [\"192.0.2.7/24\"]\n      routes:\n        - to: default\n"
        "          via: \"192.0.2.1\"\n");
    EXPECT_EQ(netplan("      dhcp4: \"Y\"\n", origin(true)), "      dhcp4: \"Y\"\n");
    Wish wish = whole("192.0.2.7", 24);
    wish.dhcp = false;
    EXPECT_EQ(netplan("      dhcp4: true\n", wish),
              "      dhcp4: false\n      addresses: [\"192.0.2.7/24\"]\n");
}

TEST(NetplanFile, HasNothingFixedBesideALease) {
    EXPECT_EQ(netplan("      dhcp4: no\n      addresses: [192.0.2.10/24]\n      gateway4: 192.0.2.1\n"
                      "      gateway6: \"2001:db8::1\"\n",
                      origin(true)),
              "      dhcp4: true\n      gateway6: \"2001:db8::1\"\n");
    EXPECT_EQ(netplan("      addresses: [192.0.2.10/24, \"2001:db8::7/64\", '192.0.2.11/24']  # ours\n"
                      "      mtu: 1400\n",
                      origin(true)),
              "      addresses: [\"2001:db8::7/64\"]  # ours\n      mtu: 1400\n      dhcp4: true\n");
    EXPECT_EQ(netplan("      addresses:\n      - \"192.0.2.10/24\":\n          label: a\n      # near\n"
                      "      - 2001:db8::7/64\n      - 192.0.2.11/24\n      routes:\n"
                      "      - to: default\n        via: 192.0.2.1\n        metric: 5\n"
                      "      - to: 198.51.100.0/24\n        via: 192.0.2.9\n",
                      origin(true)),
              "      addresses:\n      # near\n      - 2001:db8::7/64\n      routes:\n"
              "      - to: 198.51.100.0/24\n        via: 192.0.2.9\n      dhcp4: true\n");
    EXPECT_EQ(netplan("      addresses:\n      - 192.0.2.10/24\n      routes:\n"
                      "      - {to: 0.0.0.0/0, via: 192.0.2.1}\n",
                      origin(true)),
              "      dhcp4: true\n");
}

TEST(NetplanFile, IsRefusedWhereItIsNotUnderstood) {
    const auto refused = [](const std::string& text, const Wish& wish) {
        return refusal([&] { editedNetplan(text, "eth0", wish); });
    };
    const Wish wish = whole("192.0.2.7", 24);
    const std::string head = "network:\n  ethernets:\n    eth0:\n";
    EXPECT_EQ(refused(head + "      mtu: 1400\n", wish), "");
    for (const char* line :
         {"      addresses: &a [192.0.2.1/24]\n", "      addresses: *a\n", "      <<: *base\n", "\tmtu: 1\n",
          "      mtu:\t1\n", "      addresses: [192.0.2.1/24,\n        192.0.2.2/24]\n",
          "      nameservers: {addresses: [192.0.2.3],\n        search: [a]}\n", "      a: |\n        b\n",
          "      a: !!int 3\n", "      a: b\x01\n", "      a: \"b\n", "      a: \"\\x31\"\n", "      what\n",
          "  - x\n    y: z\n  q\n", "    - mtu: 1\n", "      - x\n", "---\nnetwork:\n"}) {
        EXPECT_THAT(refused(head + line, wish), HasSubstr("not understood")) << line;
    }
    EXPECT_THAT(refused("", wish), HasSubstr("no interface"));
    EXPECT_THAT(refused("network:\n  ethernets:\n    eth00:\n      mtu: 1\n", wish),
                HasSubstr("no interface"));
    EXPECT_THAT(refused("network:\n  ethernets: {eth0: {}}\n", wish), HasSubstr("not understood"));
    EXPECT_THAT(refused("network:\n  ethernets:\n    eth0: {mtu: 1400}\n", wish),
                HasSubstr("not understood"));
    EXPECT_THAT(refused(head + "      mtu: 1\n    eth0:\n      mtu: 2\n", wish), HasSubstr("more than once"));
    EXPECT_THAT(refused(head + "      dhcp4: true\n", wish), HasSubstr("comes by DHCP"));
    EXPECT_THAT(refused(head + "      dhcp4: true\n", origin(false)), HasSubstr("no address would be left"));
    EXPECT_THAT(refused(head + "      dhcp4: true\n      addresses: [192.0.2.1/24]\n", origin(true)),
                HasSubstr("fixed address"));
    EXPECT_THAT(refused(head + "      routes: [{to: default, via: 192.0.2.1}]\n", origin(true)),
                HasSubstr("not understood"));
    EXPECT_THAT(refused(head + "      mtu: 1\n", gateway("")), HasSubstr("not taken out"));
    EXPECT_THAT(refused(head + "      mtu: 1\n", prefix(24)), HasSubstr("no address"));
    EXPECT_THAT(refused(head + "      addresses: 192.0.2.1\n", wish), HasSubstr("not understood"));
}

}  // namespace
