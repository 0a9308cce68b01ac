#include "agent/core/value_check.h"
#include "tests/support/texts_are.h"

#include <gmock/gmock.h>

namespace {

using cvagent::Property;
using cvagent::check::Value;

constexpr unsigned int kComputer = 40;
constexpr unsigned int kIpConfig = 29;

Value given(unsigned int nodeType, const std::string& name, const std::vector<std::string>& words) {
    const Property* row = cvagent::findProperty(nodeType, name);
    EXPECT_TRUE(row && row->writable()) << name;
    return row->check(*row, words);
}

void expectAccepted(unsigned int nodeType, const std::string& name, const std::vector<std::string>& values) {
    for (const std::string& value : values) {
        const Value checked = given(nodeType, name, {value});
        EXPECT_TRUE(checked) << name << " refuses '" << value << "'";
        if (checked && checked->asText() != nullptr) {
            EXPECT_EQ(*checked->asText(), value);
        }
    }
}

void expectRefused(unsigned int nodeType, const std::string& name, const std::vector<std::string>& values) {
    for (const std::string& value : values) {
        EXPECT_FALSE(given(nodeType, name, {value})) << name << " accepts '" << value << "'";
    }
}

/// Whatever a value can carry into a shell or a line file.
const std::vector<std::string>& hostileTexts() {
    static const std::vector<std::string> texts = {"'",
                                                   "\"",
                                                   "`reboot`",
                                                   "$(reboot)",
                                                   "${IFS}",
                                                   "$HOME",
                                                   "a;reboot",
                                                   "a&reboot",
                                                   "a|reboot",
                                                   "a>b",
                                                   "a<b",
                                                   "a\nb",
                                                   "a\n",
                                                   "\na",
                                                   "a\rb",
                                                   "a\tb",
                                                   " a",
                                                   "a ",
                                                   "\ta",
                                                   "a b",
                                                   "a\\",
                                                   "a\\nb",
                                                   "a'b",
                                                   "a\"b",
                                                   "a#b",
                                                   "*",
                                                   "?",
                                                   "[a]",
                                                   "{a,b}",
                                                   "~",
                                                   "!a",
                                                   "%s",
                                                   "%n%n%n",
                                                   "-a",
                                                   "--help",
                                                   "-",
                                                   ".",
                                                   "..",
                                                   "../../etc/passwd",
                                                   "/etc/passwd",
                                                   std::string("a\0b", 3),
                                                   std::string("\0", 1),
                                                   std::string("192.0.2.1\0;reboot", 17),
                                                   "\x7f",
                                                   "\x1b[2J",
                                                   "\xff",
                                                   "\xc0\xaf",
                                                   "\xc3(",
                                                   "\xe2\x82(",
                                                   "\xe2\x80\xa8",
                                                   "\u0661\u0669\u0662",
                                                   "\uff11\uff19\uff12",
                                                   "\u0967",
                                                   "\u200b1",
                                                   "\u00a01",
                                                   "1\u0301",
                                                   "b\u00fccher",
                                                   "\u0430",
                                                   "+1",
                                                   " 1",
                                                   "1 ",
                                                   "01",
                                                   "1e0",
                                                   "0x1",
                                                   "1.0",
                                                   "1,0",
                                                   "1;2",
                                                   "1\n",
                                                   "99999999999999999999",
                                                   "-99999999999999999999",
                                                   std::string(512, 'a'),
                                                   std::string(512, '1'),
                                                   std::string(100000, 'a'),
                                                   std::string(100000, '1'),
                                                   std::string(100000, ' '),
                                                   std::string(100000, '.'),
                                                   std::string(100000, ':')};
    return texts;
}

TEST(ValueCheck, HostileValuesReachNoCommand) {
    for (const std::string name :
         {"IPOrigin", "IPv4Address", "SubnetMask", "IPv6Address", "EnumeratePorts", "DNSServers",
          "IPv4Gateway", "IPv6Gateway", "IPv6PrefixLength", "InterfaceState"}) {
        expectRefused(kIpConfig, name, hostileTexts());
    }
    for (const std::string name : {"PowerAction", "CurrentTime", "TimeZoneOffset"}) {
        expectRefused(kComputer, name, hostileTexts());
    }
}

TEST(ValueCheck, HostileNamesReachNoCommand) {
    for (const std::string& text : hostileTexts()) {
        const bool isName = text == "1e0";
        // Digits alone are a host name. A domain that ends in a number would be taken for an address.
        const bool isNumber = text == "01" || text == "0x1" || text == "99999999999999999999";
        if (!isName) {
            expectRefused(kIpConfig, "DomainName", {text});
            expectRefused(kIpConfig, "DNSSuffixes", {text});
        }
        if (!isName && !isNumber) {
            expectRefused(kIpConfig, "HostName", {text});
        }
    }
}

TEST(ValueCheck, HostileWordsSpoilAWholeList) {
    for (const std::string& text : hostileTexts()) {
        EXPECT_FALSE(given(kIpConfig, "DNSServers", {"192.0.2.53", text})) << text;
        EXPECT_FALSE(given(kIpConfig, "DNSServers", {text, "192.0.2.53"})) << text;
    }
    EXPECT_FALSE(given(kIpConfig, "DNSSuffixes", {"example.com", "a;b"}));
    EXPECT_FALSE(given(kIpConfig, "DNSSuffixes", {"example.com", ""}));
}

TEST(ValueCheck, OneValueIsOneWord) {
    for (const cvagent::NodeType type : {cvagent::NodeType::computer, cvagent::NodeType::ipConfig}) {
        for (const Property* each : cvagent::propertiesOf(static_cast<unsigned int>(type))) {
            const Property& row = *each;
            if (row.writable() && row.kind != cvagent::Kind::texts) {
                EXPECT_FALSE(row.check(row, {})) << row.name;
                const std::vector<std::string> two = {"1", "1"};
                EXPECT_FALSE(row.check(row, two)) << row.name;
            }
            if (row.writable() && row.id != 115 && row.id != 116 && row.id != 98 &&
                row.kind != cvagent::Kind::texts) {
                const std::vector<std::string> empty = {""};
                EXPECT_FALSE(row.check(row, empty)) << row.name;
            }
        }
    }
}

TEST(ValueCheck, Ipv4AddressesAreThoseOfHosts) {
    expectAccepted(kIpConfig, "IPv4Address",
                   {"192.0.2.10", "10.0.0.1", "1.0.0.0", "223.255.255.254", "169.254.1.1"});
    expectRefused(kIpConfig, "IPv4Address",
                  {"0.0.0.0",     "0.1.2.3",     "127.0.0.1",    "224.0.0.1",   "255.255.255.255",
                   "240.0.0.1",   "192.0.2",     "192.0.2.",     ".192.0.2",    "192.0.2.256",
                   "192.0.2.1.1", "192.0.2.01",  "192.0.2.1/24", "192.0.2.-1",  "3221225994",
                   "0300.0.2.1",  "192.0.2.0x1", "192..2.1",     "2001:db8::1", "localhost"});
    expectAccepted(kIpConfig, "IPv4Gateway", {"192.0.2.1"});
    expectRefused(kIpConfig, "IPv4Gateway", {"0.0.0.0", "192.0.2.256", "fe80::1"});
}

TEST(ValueCheck, MasksAreContiguous) {
    std::vector<std::string> good;
    for (unsigned int bits = 1; bits <= 32; ++bits) {
        const unsigned int mask = ~0U << (32 - bits);
        good.push_back(std::to_string(mask >> 24U) + "." + std::to_string((mask >> 16U) & 255U) + "." +
                       std::to_string((mask >> 8U) & 255U) + "." + std::to_string(mask & 255U));
    }
    expectAccepted(kIpConfig, "SubnetMask", good);
    expectRefused(kIpConfig, "SubnetMask",
                  {"0.0.0.0", "255.0.255.0", "255.255.255.1", "0.0.0.255", "255.255.253.0", "24", "/24",
                   "0xffffff00", "255.255.255", "255.255.255.256", "255.255.255.00"});
}

TEST(ValueCheck, Ipv6AddressesAreThoseOfInterfaces) {
    expectAccepted(kIpConfig, "IPv6Address",
                   {"2001:db8::10", "2001:DB8:0:0:0:0:0:1", "fd00::2", "64:ff9b::192.0.2.33"});
    expectRefused(kIpConfig, "IPv6Address",
                  {"::", "::1", "fe80::1", "ff02::1", "::ffff:192.0.2.1", "2001:db8::10/64",
                   "2001:db8::10%eth0", "2001:db8:::1", "2001:db8::1::2", "2001:db8::g", "[2001:db8::1]",
                   "12345::", "1:2:3:4:5:6:7", "1:2:3:4:5:6:7:8:9", "192.0.2.1"});
    expectAccepted(kIpConfig, "IPv6Gateway", {"fe80::1", "2001:db8::1"});
    expectRefused(kIpConfig, "IPv6Gateway", {"::", "::1", "ff02::2", "fe80::1%eth0", "192.0.2.1", ""});
}

TEST(ValueCheck, PrefixLengthsAreNumbersOfBits) {
    for (const std::string text : {"1", "64", "128"}) {
        const Value value = given(kIpConfig, "IPv6PrefixLength", {text});
        ASSERT_TRUE(value) << text;
        EXPECT_EQ(value->kind(), IC::PropertyValue::number);
        EXPECT_EQ(static_cast<unsigned int>(*value), static_cast<unsigned int>(std::stoul(text)));
    }
    expectRefused(kIpConfig, "IPv6PrefixLength", {"0", "129", "-1", "064", "64 ", "/64", "6.4"});
}

TEST(ValueCheck, NameServersAreAddressesOfBothKinds) {
    const Value value = given(kIpConfig, "DNSServers", {"192.0.2.53", "2001:db8::53", "127.0.0.53", "::1"});
    ASSERT_TRUE(value);
    ASSERT_NE(value->asTexts(), nullptr);
    EXPECT_THAT(*value->asTexts(), TextsAre("192.0.2.53", "2001:db8::53", "127.0.0.53", "::1"));
    expectRefused(kIpConfig, "DNSServers",
                  {"0.0.0.0", "224.0.0.1", "ff02::1", "dns.example.com", "192.0.2.53,192.0.2.54"});
}

TEST(ValueCheck, AnEmptyWordEmptiesAList) {
    for (const std::string name : {"DNSServers", "DNSSuffixes"}) {
        const Value value = given(kIpConfig, name, {""});
        ASSERT_TRUE(value);
        ASSERT_NE(value->asTexts(), nullptr);
        EXPECT_TRUE(value->asTexts()->empty());
        EXPECT_FALSE(given(kIpConfig, name, {"", ""}));
    }
}

TEST(ValueCheck, HostNamesAreOneLabel) {
    expectAccepted(kIpConfig, "HostName",
                   {"a", "host", "Host-1", "3com", "123", std::string(63, 'h'), "a--b"});
    expectRefused(
        kIpConfig, "HostName",
        {"", "-host", "host-", "host_1", "host.example.com", "host.", std::string(64, 'h'), "h\u00f6st"});
}

TEST(ValueCheck, DomainNamesAreLabelsJoinedByDots) {
    const std::string label(62, 'd');
    const std::string longest = label + "." + label + "." + label + "." + label + ".d";  // 253 characters
    ASSERT_EQ(longest.size(), 253U);
    expectAccepted(kIpConfig, "DomainName",
                   {"", "example", "example.com", "a.b.c.d", "xn--bcher-kva.example", "10.0.0.7.example",
                    "3com", "0xyz", longest});
    expectRefused(kIpConfig, "DomainName",
                  {".", ".com", "com.", "a..b", "-a.b", "a-.b", "a.-b", "a_b.c", longest + "d",
                   std::string(64, 'd') + ".com"});
    const std::vector<std::string> addresses = {"10.0.0.07", "10.0.0.7", "example.07",
                                                "7",         "0x7",      "10.0.0.0X1f"};
    expectRefused(kIpConfig, "DomainName", addresses);
    expectRefused(kIpConfig, "DNSSuffixes", addresses);
}

TEST(ValueCheck, SuffixesAreDomainsHoweverMany) {
    const Value value = given(kIpConfig, "DNSSuffixes", {"example.com", "example.org"});
    ASSERT_TRUE(value && value->asTexts() != nullptr);
    EXPECT_THAT(*value->asTexts(), TextsAre("example.com", "example.org"));
    EXPECT_TRUE(given(kIpConfig, "DNSSuffixes", std::vector<std::string>(50, "example.com")));
}

TEST(ValueCheck, CodesComeAsTheKindThePluginCompares) {
    const Value origin = given(kIpConfig, "IPOrigin", {"3"});
    ASSERT_TRUE(origin);
    EXPECT_EQ(*origin, IC::PropertyValue(IC::EnumValue(3), true));
    const Value state = given(kIpConfig, "InterfaceState", {"12"});
    ASSERT_TRUE(state);
    EXPECT_EQ(*state, IC::PropertyValue(IC::Number(12U), true));
    const Value enumerate = given(kIpConfig, "EnumeratePorts", {"1"});
    ASSERT_TRUE(enumerate);
    EXPECT_EQ(*enumerate, IC::PropertyValue(IC::Number(1U), true));
    const Value power = given(kComputer, "PowerAction", {"9"});
    ASSERT_TRUE(power);
    EXPECT_EQ(*power, IC::PropertyValue(IC::EnumValue(9), true));
}

TEST(ValueCheck, OnlyTheListedCodesAreWritten) {
    expectAccepted(kComputer, "PowerAction", {"1", "9", "12"});
    expectRefused(kComputer, "PowerAction", {"0", "2", "10", "11", "13", "-9", "09", "9 "});
    expectAccepted(kIpConfig, "IPOrigin", {"1", "3"});
    expectRefused(kIpConfig, "IPOrigin", {"0", "2", "4", "BOOTP"});
    expectAccepted(kIpConfig, "InterfaceState", {"1", "9", "12", "16"});
    expectRefused(kIpConfig, "InterfaceState", {"0", "2", "32", "33", "switched over"});
    expectRefused(kIpConfig, "EnumeratePorts", {"0", "2"});
}

TEST(ValueCheck, LabelsStandForCodes) {
    EXPECT_EQ(*given(kIpConfig, "IPOrigin", {"dhcp"}), IC::PropertyValue(IC::EnumValue(1), true));
    EXPECT_EQ(*given(kIpConfig, "IPOrigin", {"Static"}), IC::PropertyValue(IC::EnumValue(3), true));
    EXPECT_EQ(*given(kIpConfig, "InterfaceState", {"down"}), IC::PropertyValue(IC::Number(12U), true));
    EXPECT_EQ(*given(kComputer, "PowerAction", {"halt"}), IC::PropertyValue(IC::EnumValue(12), true));
}

TEST(ValueCheck, EveryOffsetWithAZoneIsAcceptedAndNoOther) {
    int accepted = 0;
    for (int offset = -800; offset <= 900; ++offset) {
        if (const Value value = given(kComputer, "TimeZoneOffset", {std::to_string(offset)})) {
            ++accepted;
            EXPECT_EQ(static_cast<unsigned int>(*value), static_cast<unsigned int>(offset));
        }
    }
    EXPECT_EQ(accepted, 29);
    expectRefused(kComputer, "TimeZoneOffset",
                  {"345", "-0", "00", "+60", "60.0", "CET", "4294967236", "- 60"});
}

TEST(ValueCheck, TimesAreWhatTheClockCanHold) {
    expectAccepted(kComputer, "CurrentTime",
                   {"2026-11-20T21:03:00Z", "2026-11-20T21:03:00+05:30", "2026-11-20T21:03:00"});
    expectRefused(
        kComputer, "CurrentTime",
        {"now", "2026-11-20", "21:03:00", "2026-13-20T21:03:00Z", "2026-02-30T21:03:00Z", "1795208583",
         "2026-11-20 21:03:00", "2026-11-20T25:03:00Z", "2026-11-20T21:03:00Z; reboot"});
}

TEST(ValueCheck, OwnerTextsAreOneLine) {
    expectAccepted(
        kComputer, "OwnerContact",
        {"", "root@example.com", "O'Neill & Sons \"Ltd\"; $(room) `5`", "J\u00fcrgen, \u6771\u4eac",
         std::string(1024, 'x'), " leading blank", "-x", "[a,b]", "\U0001F600"});
    expectRefused(kComputer, "OwnerName",
                  {"a\nb", "a\r", "a\tb", std::string("a\0b", 3), "\x1b[2J", "\x7f", "\u0085", "\u009b2J",
                   "\u2028", "\u202e", "\xff", "\xc3", "\xc3(", "\xc0\xaf", "\xed\xa0\x80",
                   "\xf4\x90\x80\x80", std::string(1025, 'x'), std::string(100000, 'x')});
}

}  // namespace
