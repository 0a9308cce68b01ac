#include "network/address_queries.h"

#include <gmock/gmock.h>
#include <netinet/in.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>

#include "tests/network/recording.h"
#include "tests/support/command_lines.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/no_descriptors.h"
#include "tests/support/texts_are.h"

namespace {

using testing::IsEmpty;

/// The error with which the next sockets are refused; 0 for none.
int refusal = 0;
std::vector<std::vector<int>> sockets;

}  // namespace

// Stands in front of the C library's for the code in this program.
extern "C" __attribute__((visibility("default"))) int socket(int domain, int type, int protocol) noexcept {
    sockets.push_back({domain, type, protocol});
    if (refusal != 0) {
        errno = refusal;
        return -1;
    }
#ifdef SYS_socket
    return static_cast<int>(syscall(SYS_socket, domain, type, protocol));
#else
    const long arguments[] = {domain, type, protocol};
    return static_cast<int>(syscall(SYS_socketcall, 1, arguments));
#endif
}

namespace {

int lowestFreeDescriptor() {
    const int lowest = dup(STDERR_FILENO);
    close(lowest);
    return lowest;
}

HOST_TEST(IPv6Stack, IsActiveWhenASocketCanBeOpened) {
    const LogCapture capture;
    const int before = lowestFreeDescriptor();
    EXPECT_TRUE(IC::isIPv6StackActive());
    EXPECT_EQ(lowestFreeDescriptor(), before) << "the socket was left open";
    EXPECT_EQ(sockets.back(), (std::vector<int>{10, 1, 6}));
    EXPECT_THAT(capture.messages(), TextsAre("isIPv6StackActive: entry", "isIPv6StackActive: exit"));
}

HOST_TEST(IPv6Stack, IsActiveAlsoWhenTheKernelHasNone) {
    for (const int error : {EAFNOSUPPORT, EMFILE, EACCES, EPROTONOSUPPORT, ENOBUFS}) {
        refusal = error;
        EXPECT_TRUE(IC::isIPv6StackActive()) << error;
    }
    EXPECT_EQ(EAFNOSUPPORT, 97);
}

HOST_TEST(IPv6Stack, LeavesDescriptor0Open) {
    const int standardInput = dup(STDIN_FILENO);
    close(STDIN_FILENO);
    EXPECT_TRUE(IC::isIPv6StackActive());
    int type = 0;
    socklen_t size = sizeof type;
    EXPECT_EQ(getsockopt(STDIN_FILENO, SOL_SOCKET, SO_TYPE, &type, &size), 0) << "no socket any more";
    dup2(standardInput, STDIN_FILENO);
    close(standardInput);
}

HOST_TEST(IPv4Details, AreTwoQuestions) {
    host.tool("ifconfig eth0", recording("ifconfig/ethernet.txt"));
    const CommandLines commands;
    const LogCapture capture;
    std::string address;
    std::string mask;
    EXPECT_TRUE(IC::getIPv4Details("eth0", address, mask));
    EXPECT_EQ(address, "192.168.17.4");
    EXPECT_EQ(mask, "255.255.255.0");
    EXPECT_THAT(commands.all(),
                TextsAre("ifconfig eth0 2> /dev/null | grep \"inet addr:\" | tr -s ' ' | cut -d: -f2"
                         " | cut -d ' ' -f1 2> /dev/null",
                         "ifconfig eth0 2> /dev/null | grep \"inet addr:\" | tr -s ' ' | cut -d: -f4"
                         " 2> /dev/null"));
    EXPECT_THAT(capture.messages(), TextsAre("getIPv4Details: entry", "getIPv4Details: exit"));
}

HOST_TEST(IPv4Details, WithoutAnAddressTheMaskIsNotAskedFor) {
    host.tool("ifconfig eth0", recording("ifconfig/ethernet-no-address.txt"));
    const CommandLines commands;
    std::string address = "before";
    std::string mask = "before";
    EXPECT_FALSE(IC::getIPv4Details("eth0", address, mask));
    EXPECT_EQ(commands.all().size(), 1U);
    EXPECT_EQ(address, "before");
    EXPECT_EQ(mask, "before");
}

HOST_TEST(IPv4Details, AnAddressThatGoesAwayInBetweenStaysSet) {
    host.toolInTurn("ifconfig eth0", {{.out = recording("ifconfig/ethernet.txt")}, {.out = ""}});
    std::string address = "before";
    std::string mask = "before";
    EXPECT_FALSE(IC::getIPv4Details("eth0", address, mask));
    EXPECT_EQ(address, "192.168.17.4");
    EXPECT_EQ(mask, "before");
}

HOST_TEST(AddressDetails, AreTheThirdFieldOfALine) {
    const CommandLines commands;
    const LogCapture capture;
    std::string address;
    unsigned int prefix = 0;
    EXPECT_TRUE(IC::getAddressDetails("    inet6 2001:db8::1/64 scope global \n", address, prefix));
    EXPECT_EQ(address, "2001:db8::1");
    EXPECT_EQ(prefix, 64U);
    EXPECT_THAT(commands.all(), TextsAre("echo \"    inet6 2001:db8::1/64 scope global \n\" | tr -s ' '"
                                         " | cut -d ' ' -f3 2> /dev/null"));
    // A plain pipe: the count of open pipes is not logged.
    EXPECT_THAT(capture.messages(), TextsAre("getAddressDetails: entry", "getAddressDetails: exit"));
}

HOST_TEST(AddressDetails, ALineWithoutASlashIsLoggedAndTheNextOneRead) {
    const LogCapture capture;
    std::string address = "before";
    unsigned int prefix = 7;
    EXPECT_FALSE(IC::getAddressDetails("    inet6 2001:db8::1 scope global", address, prefix));
    EXPECT_EQ(address, "before");
    EXPECT_EQ(prefix, 7U);
    EXPECT_THAT(capture.messages(6000), TextsAre("Invalid format: buffer = 2001:db8::1\n"));
    EXPECT_TRUE(IC::getAddressDetails("    inet6 none\n    inet6 2001:db8::2/48\n", address, prefix));
    EXPECT_EQ(address, "2001:db8::2");
    EXPECT_EQ(prefix, 48U);
    EXPECT_EQ(capture.messages(6000).back(), "Invalid format: buffer = none\n");
}

HOST_TEST(AddressDetails, ALineThatFillsTheCommandBufferIsNotRun) {
    const LogCapture capture;
    const CommandLines commands;
    std::string address = "before";
    unsigned int prefix = 7;
    EXPECT_FALSE(IC::getAddressDetails("    inet6 2001:db8::1/64 " + std::string(480, 'x'), address, prefix));
    EXPECT_EQ(address, "before");
    EXPECT_THAT(commands.all(), IsEmpty());
    EXPECT_EQ(capture.messages(6000).size(), 1U);
}

HOST_TEST(IPv6Address, IsAskedThroughAPlainPipe) {
    host.tool("ip -6 address show dev eth0", recording("ip6/dynamic.txt"));
    const CommandLines commands;
    const LogCapture capture;
    std::string address;
    unsigned int prefix = 0;
    EXPECT_TRUE(IC::getIPv6Address("eth0", address, prefix));
    ASSERT_EQ(commands.all().size(), 2U);
    EXPECT_EQ(commands.all()[0], "ip -6 address show dev eth0 | grep \"global\"");
    EXPECT_THAT(capture.messages(), TextsAre("getIPv6Address: entry", "getAddressDetails: entry",
                                             "getAddressDetails: exit", "getIPv6Address: exit"));
}

HOST_TEST(IPv6Address, WithoutAShellIsNone) {
    std::string address = "before";
    unsigned int prefix = 7;
    const NoDescriptors none;
    EXPECT_FALSE(IC::getIPv6Address("eth0", address, prefix));
    EXPECT_EQ(address, "");
    EXPECT_EQ(prefix, 0U);
}

struct Protocols {
    const char* ip;
    const char* ifconfig;
    unsigned int code;
    unsigned int kind;  ///< 0: none
};

constexpr Protocols kProtocols[] = {
    {"nothing", "ethernet-ipv4-only", 4096, 2},
    {"link-local-only", "ethernet", 4096, 2},
    {"nothing", "ethernet-no-address", 4096, 2},
    {"nothing", "missing-device", 4096, 2},
    {"static", "ethernet", 4098, 7},
    {"dynamic", "ethernet-several-inet6", 4098, 7},
    {"static", "ethernet-ipv6-link-only", 4097, 5},
    {"dynamic", "ethernet-global-first", 4097, 5},
    {"static", "ethernet-site-only", 4097, 5},
    {"static", "loopback-ipv6-only", 4097, 5},
    {"static", "ethernet-no-address", 4097, 0},
    {"static", "new-format", 4097, 0},
};

HOST_TEST(ProtocolCodes, FollowFromTheAddresses) {
    for (const Protocols& row : kProtocols) {
        SCOPED_TRACE(std::string(row.ip) + " " + row.ifconfig);
        host.tool("ip -6 address show dev eth0", recording(std::string("ip6/") + row.ip + ".txt"));
        host.tool("ifconfig eth0", recording(std::string("ifconfig/") + row.ifconfig + ".txt"));
        unsigned int code = 1;
        EXPECT_TRUE(IC::getProtocolIIFType("eth0", code));
        EXPECT_EQ(code, row.code);
        unsigned int kind = 0;
        EXPECT_EQ(IC::getIPv6AddressType("eth0", kind), row.kind != 0);
        EXPECT_EQ(kind, row.kind);
    }
}

HOST_TEST(ProtocolCodes, LogTheAddresses) {
    host.tool("ip -6 address show dev eth0", recording("ip6/static.txt"));
    host.tool("ifconfig eth0", recording("ifconfig/ethernet.txt"));
    const LogCapture capture;
    unsigned int code = 0;
    IC::getProtocolIIFType("eth0", code);
    EXPECT_THAT(capture.messages(3000),
                TextsAre("getProtocolIIFType: entry", "getIPv6Address: entry", "getAddressDetails: entry",
                         "getAddressDetails: exit", "getIPv6Address: exit", "getIPv4Details: entry",
                         "getIPv4Details: exit", "ipv6_addr : 2001:db8:4:1::31", "ipv4_addr : 192.168.17.4",
                         "protocolIIFType : 4098", "getProtocolIIFType: exit"));
}

HOST_TEST(AddressKind, OfIPv6AloneIsAskedForItsScope) {
    host.tool("ip -6 address show dev eth0", recording("ip6/static.txt"));
    host.tool("ifconfig eth0", recording("ifconfig/ethernet-global-first.txt"));
    const CommandLines commands;
    const LogCapture capture;
    unsigned int kind = 0;
    EXPECT_TRUE(IC::getIPv6AddressType("eth0", kind));
    // Whatever the scope: its line ends in a line break, and so it is never the word "Link".
    EXPECT_EQ(kind, 5U);
    EXPECT_EQ(commands.all().back(),
              "ifconfig eth0 2> /dev/null | grep \"Scope:\" | tr -s ' ' | cut -d ' ' -f5 | cut -d ':' -f2"
              " 2> /dev/null");
    EXPECT_THAT(capture.messages(3000), testing::Contains("buffer = Global\n"));
}

HOST_TEST(AddressKind, OfOtherProtocolsNeedsNoCommand) {
    host.tool("ip -6 address show dev eth0", "");
    host.tool("ifconfig eth0", recording("ifconfig/ethernet.txt"));
    const CommandLines commands;
    unsigned int kind = 0;
    EXPECT_TRUE(IC::getIPv6AddressType("eth0", kind));
    EXPECT_EQ(kind, 2U);
    for (const std::string& command : commands.all()) {
        EXPECT_THAT(command, testing::Not(testing::HasSubstr("Scope:")));
    }
}

HOST_TEST(AddressQueries, AnOverlongNameIsAnsweredAsIfThereWereNoShell) {
    const LogCapture capture;
    const CommandLines commands;
    const std::string name(600, 'x');
    std::string address = "before";
    std::string mask = "before";
    unsigned int number = 7;
    EXPECT_FALSE(IC::getIPv4Details(name, address, mask));
    EXPECT_EQ(address + mask, "beforebefore");
    EXPECT_FALSE(IC::getIPv6Address(name, address, number));
    EXPECT_EQ(address, "");
    EXPECT_TRUE(IC::getProtocolIIFType(name, number));
    EXPECT_EQ(number, 4096U);
    EXPECT_THAT(commands.all(), IsEmpty());
    EXPECT_EQ(capture.messages(6000).size(), 4U);
}

}  // namespace
