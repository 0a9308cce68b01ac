// The parsers alone: what they make of a line, good or not.
#include <gtest/gtest.h>

#include <climits>

#include "network/address_parse.h"
#include "network/link_parse.h"

namespace {

using namespace IC::parse;

struct Number {
    const char* text;
    int value;
};

constexpr Number kNumbers[] = {
    {"0", 0},
    {"64", 64},
    {"64\n", 64},
    {"1000Mb/s\n", 1000},
    {"+5", 5},
    {"-5", -5},
    {"  7", 7},
    {"\t7", 7},
    {"007", 7},
    {"2147483647", INT_MAX},
    {"2147483648", INT_MAX},
    {"4294967295", INT_MAX},
    {"18446744073709551615", INT_MAX},
    {"99999999999999999999999999", INT_MAX},
    {"-2147483648", INT_MIN},
    {"-2147483649", INT_MIN},
    {"-99999999999999999999999999", INT_MIN},
    {"", 0},
    {"\n", 0},
    {"x", 0},
    {"x1", 0},
    {"- 1", 0},
    {"--1", 0},
    {"+-1", 0},
    {"Unknown!", 0},
    {"1e6", 1},
    {"1.5", 1},
    {"1,000", 1},
    {"0x10", 0},
    {"1 000", 1},
};

TEST(LeadingNumber, IsTheSameOnEveryMachine) {
    for (const Number& row : kNumbers) {
        EXPECT_EQ(leadingNumber(row.text), row.value) << row.text;
    }
}

TEST(LeadingNumber, EndsAtAZeroByte) {
    EXPECT_EQ(leadingNumber(std::string("1\0002", 3)), 1);
}

struct Speed {
    const char* line;
    unsigned long long kilobits;
};

constexpr Speed kSpeeds[] = {
    {"10Mb/s\n", 10'000},
    {"10000Mb/s\n", 10'000'000},
    {"Unknown!\n", 0},
    {"2147483\n", 2'147'483'000},
    {"2147484\n", 0xFFFF'FFFF'8000'0160},
    {"4294967\n", 0xFFFF'FFFF'FFFF'FED8},
    {"4294968\n", 704},
    {"-1\n", 0xFFFF'FFFF'FFFF'FC18},
    {"-2147483648\n", 0},
    {"2147483647\n", 0xFFFF'FFFF'FFFF'FC18},
};

TEST(NetworkSpeed, WrapsIn32BitsAndIsSignExtended) {
    for (const Speed& row : kSpeeds) {
        EXPECT_EQ(networkSpeed(row.line), row.kilobits) << row.line;
    }
}

TEST(LinkWords, AreMatchedAnywhereInTheLine) {
    EXPECT_TRUE(isFullDuplex("\tDuplex: Full\n"));
    for (const char* line :
         {"", "\tDuplex: Half\n", "\tDuplex: full\n", "\tDuplex: FULL\n", "\tDuplex: Ful", "Fu ll"}) {
        EXPECT_FALSE(isFullDuplex(line)) << line;
    }
    EXPECT_TRUE(isAutoSense("\tAuto-negotiation: on\n"));
    EXPECT_TRUE(isAutoSense("\tAuto-negotiation: off\n"));  // negotiatiON
    for (const char* line : {"", "off", "On", "ON", "o n", "Auto: off"}) {
        EXPECT_FALSE(isAutoSense(line)) << line;
    }
    EXPECT_TRUE(isLinkDetected("\tLink detected: yes\n"));
    for (const char* line : {"", "no", "Yes", "YES", "ye", "y es", "\tLink detected: no\n"}) {
        EXPECT_FALSE(isLinkDetected(line)) << line;
    }
    EXPECT_TRUE(isMiiUp("MII Status: up\n"));
    EXPECT_TRUE(isMiiUp("MII Status: interrupted\n"));
    for (const char* line :
         {"", "MII Status: down\n", "MII Status: Up\n", "MII Status: going down\n", "u p", "pu"}) {
        EXPECT_FALSE(isMiiUp(line)) << line;
    }
}

struct Member {
    const char* line;
    const char* probed;  ///< 16 characters taken off
    const char* listed;  ///< 17 characters taken off
};

constexpr Member kMembers[] = {
    {"Slave Interface: eth0\n", " eth0", "eth0"},
    {"Slave Interface: eth0", " eth0", "eth0"},
    {"Slave Interface: eth0\n\n", " eth0", "eth0"},
    {"Slave Interface:eth0\n", "eth0", "th0"},
    {"Slave Interface:\teth0\n", "\teth0", "eth0"},
    {"Slave Interface:  eth0  \n", "  eth0  ", " eth0"},
    {"Slave Interface: eth0 \n ", " eth0 \n ", "eth0 \n"},
    {"Slave Interface: e h\n", " e h", "e h"},
    {"Slave Interface: \n", " ", ""},
    {"Slave Interface:\n", "", ""},
    {"Slave Interface:", "", ""},
    {"Slave Interface: eth0\r\n", " eth0\r", "eth0\r"},
    {"xSlave Interface: eth0\n", " eth0", "eth0"},
    {"Slave Interface: Slave Interface: eth0\n", " Slave Interface: eth0", "Slave Interface: eth0"},
    // The tail of a line that did not fit the buffer.
    {"eth0\n", "eth0", "eth0"},
    {"Slave Interfac", "Slave Interfac", "Slave Interfac"},
    {"slave interface: eth0\n", "slave interface: eth0", "slave interface: eth0"},
    {"", "", ""},
    {"\n", "", ""},
};

TEST(BondMembers, TheTwoReadersDifferByOneCharacter) {
    for (const Member& row : kMembers) {
        EXPECT_EQ(bondMemberToProbe(row.line), row.probed) << row.line;
        EXPECT_EQ(bondMember(row.line), row.listed) << row.line;
    }
}

struct Name {
    const char* line;
    const char* name;
    bool ofBridge;
};

constexpr Name kNames[] = {
    {"  eth0: 123 4 5\n", "  eth0", false},
    {"  eth0:123 4 5\n", "  eth0", false},
    {"eth0\n", "eth0", false},
    {"eth0", "eth0", false},
    {"eth0.10: 1\n", "eth0.10", false},
    {"eth0:1: 7 8\n", "eth0:1", false},
    {" bond0: 0 0\n", " bond0", false},
    {"usb0:\n", "usb0", false},
    {"br0\t\t8000.001a640b7c10\tno\t\teth0\n", "br0", true},
    {"br0\n", "br0", true},
    {"br0", "br0", true},
    {"br0: 1 2\n", "br0", true},
    {"  br0: 1 2: 3\n", "  br0: 1 2", true},
    {"virbr0\t8000.52:54\n", "virbr0\t8000.52", true},
    {"docker0\t\t8000.0242ac110001\tno\t\tveth3f21a0c\n", "docker0\t\t8000.0242ac110001\tno\t\tveth3f21a0c",
     false},
    {"\t\t\t\t\t\t\teth1\n", "\t\t\t\t\t\t\teth1", false},
    {"\t\tvnetbr1\n", "", true},
    {"br", "br", true},
    {"b r0: 1\n", "b r0", false},
    {"BR0: 1\n", "BR0", false},
    {"", "", false},
    {"\n", "", false},
    {":", "", false},
    {": 1\n", "", false},
    {"\n:1", "", false},
};

TEST(NicNames, EndAtTheLastColonOrTheFirstTabOfABridge) {
    for (const Name& row : kNames) {
        const NICName found = nicName(row.line);
        EXPECT_EQ(found.name, row.name) << row.line;
        EXPECT_EQ(found.ofBridge, row.ofBridge) << row.line;
    }
}

TEST(BridgeMember, LosesBlanksFirstAndThenTabs) {
    EXPECT_EQ(bridgeMember("eth0\n"), "eth0");
    EXPECT_EQ(bridgeMember("  \t\teth0\n\n"), "eth0");
    EXPECT_EQ(bridgeMember("\t eth0\n"), " eth0");
    EXPECT_EQ(bridgeMember("eth0 \t\n"), "eth0 \t");
    EXPECT_EQ(bridgeMember(" \t\n"), "");
    EXPECT_EQ(bridgeMember("\n"), "");
    EXPECT_EQ(bridgeMember(""), "");
}

struct Address {
    const char* line;
    const char* address;  ///< null: none
    unsigned int prefixLength;
};

constexpr Address kAddresses[] = {
    {"2001:db8::1/64\n", "2001:db8::1", 64},
    {"2001:db8::1/64", "2001:db8::1", 64},
    {"::/0\n", "::", 0},
    {"10.0.0.1/8\n", "10.0.0.1", 8},
    {"a/1/2\n", "a", 1},
    {"a/\n", "a", 0},
    {"a/x\n", "a", 0},
    {"/64\n", "", 64},
    {"/", "", 0},
    {"a/-1", "a", 4294967295U},
    {"a/99999999999", "a", 2147483647U},
    {"a/ 64", "a", 64},
    {"a/64x", "a", 64},
    {"2001:db8::1\n", nullptr, 0},
    {"\n", nullptr, 0},
    {"", nullptr, 0},
    {"<BROADCAST,MULTICAST,UP>\n", nullptr, 0},
    {"2001:db8::1\\64\n", nullptr, 0},
};

TEST(AddressAndPrefixes, ArePartedByTheFirstSlash) {
    for (const Address& row : kAddresses) {
        const auto found = addressAndPrefix(row.line);
        ASSERT_EQ(found.has_value(), row.address != nullptr) << row.line;
        if (found) {
            EXPECT_EQ(found->address, row.address) << row.line;
            EXPECT_EQ(found->prefixLength, row.prefixLength) << row.line;
        }
    }
}

TEST(AddressKinds, OnlyABareWordLinkIsNot5) {
    EXPECT_EQ(addressKind("Link"), 6U);
    for (const char* scope : {"Link\n", "Global\n", "Site\n", "Host\n", "Global", "Site", "Host", "", "\n",
                              "link", "Link ", " Link", "Linklocal", "Lin", "Compat\n", "Unknown\n"}) {
        EXPECT_EQ(addressKind(scope), 5U) << scope;
    }
}

TEST(AutoconfiguredAddresses, HoldTheWordDynamic) {
    EXPECT_TRUE(isAutoconfigured("    inet6 2001:db8::1/64 scope global dynamic \n"));
    EXPECT_TRUE(isAutoconfigured("scope global temporary dynamic"));
    for (const char* line :
         {"", "scope global \n", "scope global Dynamic", "mngtmpaddr", "dynami", "temporary"}) {
        EXPECT_FALSE(isAutoconfigured(line)) << line;
    }
}

struct Route {
    const char* line;
    const char* gateway;  ///< null: none
};

constexpr Route kRoutes[] = {
    {"0.0.0.0 192.168.17.1 0.0.0.0 UG 0 0 0 eth0\n", "192.168.17.1"},
    {"10.0.0.0 0.0.0.0 255.0.0.0 U 0 0 0 eth0\n", "0.0.0.0"},
    {"0.0.0.0 192.168.17.1\n", "192.168.17.1"},
    {"0.0.0.0 192.168.17.1", "192.168.17.1"},
    {"0.0.0.0   192.168.17.1   0.0.0.0\n", "192.168.17.1"},
    {" 0.0.0.0 192.168.17.1 0.0.0.0\n", "192.168.17.1"},
    {"a b\n\n", "b"},
    {"a\tb c\n", "c"},
    {"a \n", ""},
    {"a\n", nullptr},
    {"a", nullptr},
    {"a ", nullptr},
    {" a ", nullptr},
    {" a", nullptr},
    {" ", nullptr},
    {"    ", nullptr},
    {"\n", nullptr},
    {"", nullptr},
};

TEST(GatewayField, IsTheSecondBetweenBlanks) {
    for (const Route& row : kRoutes) {
        const auto found = gatewayField(row.line);
        ASSERT_EQ(found.has_value(), row.gateway != nullptr) << '"' << row.line << '"';
        EXPECT_EQ(found.value_or(""), row.gateway != nullptr ? row.gateway : "") << row.line;
    }
}

TEST(Unquoted, LosesAllQuotesAndTheLineBreak) {
    EXPECT_EQ(unquoted("'dhcp'\n"), "dhcp");
    EXPECT_EQ(unquoted("\"static\"\n"), "static");
    EXPECT_EQ(unquoted("none\n"), "none");
    EXPECT_EQ(unquoted("'\"d'h\"c\"p'\n\n"), "dhcp");
    EXPECT_EQ(unquoted("`dhcp`\n"), "`dhcp`");
    EXPECT_EQ(unquoted(" 'dhcp' \r\n"), " dhcp \r");
    EXPECT_EQ(unquoted("'\n'"), "\n");
    EXPECT_EQ(unquoted("''\n"), "");
    EXPECT_EQ(unquoted("\n"), "");
    EXPECT_EQ(unquoted(""), "");
}

TEST(DhcpV6ServerIdentities, LoseTheSemicolonsAtTheEnd) {
    EXPECT_EQ(dhcpv6Server("00:01;\n"), "00:01");
    EXPECT_EQ(dhcpv6Server("00:01;;;\n\n"), "00:01");
    EXPECT_EQ(dhcpv6Server("00;01\n"), "00;01");
    EXPECT_EQ(dhcpv6Server("00:01; \n"), "00:01; ");
    EXPECT_EQ(dhcpv6Server("00:01;\n;\n"), "00:01;\n");
    EXPECT_EQ(dhcpv6Server(";\n"), "");
    EXPECT_EQ(dhcpv6Server(""), "");
}

}  // namespace
