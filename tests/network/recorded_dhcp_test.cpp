// What lease files and interface files held on many hosts, through the machine's own text tools.
#include "network/dhcp_queries.h"
#include "tests/network/recording.h"
#include "tests/support/fake_host.h"

namespace {

struct Lease {
    const char* file;
    bool held;
};

constexpr Lease kLeases[] = {
    {"full-lease", true},    {"short-lease", true},     {"blank-first-line", true},
    {"no-line-break", true}, {"long-first-line", true}, {"carriage-returns", true},
    {"nothing", false},
};

HOST_TEST(RecordedLeases, AnyContentIsALease) {
    for (const Lease& row : kLeases) {
        SCOPED_TRACE(row.file);
        host.file("/var/lib/dhcpcd/dhcpcd-eth0.info", recording(std::string("dhcpcd/") + row.file + ".txt"));
        EXPECT_EQ(IC::checkIsDhcp("eth0"), row.held);
        EXPECT_FALSE(IC::checkIsDhcp("eth1"));
    }
}

struct Server {
    const char* file;
    const char* identity;  ///< null: none
};

constexpr Server kServers[] = {
    {"one-lease", "00:01:00:06:1a:2b:3c:4d:00:0f:b5:22:10:01"},
    {"two-leases", "00:01:00:06:1a:2b:3c:4d:00:0f:b5:22:10:01"},
    {"label-with-colon", "00:03:00:01:00:0f:b5:22:10:01"},
    {"no-semicolon", "00:03:00:01:00:0f:b5:22:10:02"},
    {"several-semicolons", "00:03:00:01:00:0f:b5:22:10:03"},
    {"semicolon-inside", "00:03;00:01"},
    {"no-line-break", "00:03:00:01:00:0f:b5:22:10:04"},
    {"only-semicolons", ""},
    {"carriage-returns", "00:03:00:01:00:0f:b5:22:10:05;\r"},
    {"client-identity-only", nullptr},
    {"lower-case", nullptr},
    {"two-fields", ""},
    {"one-field", "SDUID"},
    {"two-blanks", ""},
    {"nothing", nullptr},
};

HOST_TEST(RecordedLeases, ServerIdentity) {
    for (const Server& row : kServers) {
        SCOPED_TRACE(row.file);
        host.file("/var/lib/dhcpv6/client6.leases", recording(std::string("dhcpv6/") + row.file + ".txt"));
        std::string identity = "before";
        EXPECT_EQ(IC::getDHCPv6Servers("eth0", identity), row.identity != nullptr);
        EXPECT_EQ(identity, row.identity != nullptr ? row.identity : "before");
    }
}

struct InterfaceFile {
    const char* file;
    const char* keyword;
};

constexpr InterfaceFile kInterfaceFiles[] = {
    {"dhcp-single-quotes", "dhcp"},
    {"static-single-quotes", "static"},
    {"dhcp-double-quotes", "dhcp"},
    {"dhcp-no-quotes", "dhcp"},
    {"none", "none"},
    {"bootp", "bootp"},
    {"dhcp4", "dhcp4"},
    {"dhcp6", "dhcp6"},
    {"last-line-no-break", "static"},
    {"mixed-quotes", "dhcp"},
    {"quotes-inside", "dhcp"},
    {"leading-blanks", "dhcp"},
    {"export", "static"},
    {"upper-case-value", "DHCP"},
    {"two-keys", "static"},
    {"empty-value", ""},
    {"no-value", ""},
    {"lower-case-key", ""},
    {"without-key", ""},
    {"nothing", ""},
    // What stands behind the value stays with it, and a comment with the key in it counts.
    {"comment-behind", "static # set by hand"},
    {"comment-line-first", "# BOOTPROTO may be dhcp, static or none"},
    {"commented-out", "dhcp"},
    {"carriage-returns", "dhcp\r"},
    {"blanks-round-equals", " dhcp"},
    {"longer-key-first", "none"},
    {"equals-in-value", "a"},
    {"no-equals", "BOOTPROTO"},
};

HOST_TEST(RecordedInterfaceFiles, BootProtocol) {
    host.tool("ifconfig eth0", recording("ifconfig/ethernet.txt"));
    for (const InterfaceFile& row : kInterfaceFiles) {
        SCOPED_TRACE(row.file);
        host.file("/etc/sysconfig/network/ifcfg-eth-id-00:1a:64:0b:7c:10",
                  recording(std::string("ifcfg/") + row.file + ".txt"));
        std::string keyword = "before";
        IC::getBootProto("eth0", keyword);
        EXPECT_EQ(keyword, row.keyword);
    }
}

}  // namespace
