// cvagent and the real plug-in on a host whose tools print what no tool should.
#include <gmock/gmock.h>
#include <sys/mount.h>
#include <sys/resource.h>

#include <nlohmann/json.hpp>

#include "tests/agent/hostile_host.h"
#include "tests/agent/suse_host.h"

namespace {

using testing::HasSubstr;
using testing::Not;
using Json = nlohmann::ordered_json;

constexpr const char* kGigabyte = "| head -c 1000000000";

/// In MB: for a gigabyte far too little, for what is read of it enough. Sanitizers keep several times as
/// much.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr long kMuchMemory = 1500;
#else
constexpr long kMuchMemory = 300;
#endif

/// The most memory that a program of this test has had, in MB.
long mostMemory() {
    rusage usage{};
    getrusage(RUSAGE_CHILDREN, &usage);
    return usage.ru_maxrss / 1024;
}

HOST_TEST(HugeOutput, OfAQueryIsReadAsFarAsItsAnswer) {
    SuseHost suse(host);
    // Behind the answer lines whose second word is long: the 64 MiB that are read of a command are soon
    // there.
    host.tool("route -A inet6 -n", ToolAnswer{.out = "",
                                              .action = "echo '::/0 fe80::1 UG 1024 0 0 eth0'; yes '::/0 " +
                                                        std::string(400, 'x') + " UG eth0'" + kGigabyte});
    const Finished run =
        suse.run({"--command-timeout", "500", "get", "ip-config:eth0", "IPv6Gateway", "--json"});
    EXPECT_EQ(run.status, 0);
    EXPECT_EQ(Json::parse(run.out)["properties"]["101"]["value"], "fe80::1");
}

HOST_TEST(HugeOutput, OfAListingIsReadAsFarAsASaneOneGoes) {
    SuseHost suse(host);
    // Known once it has been visited: every other line that names it costs no command.
    host.tool("ifconfig -a", "br0       Link encap:Ethernet\neth0      Link encap:Ethernet\n");
    host.tool("ifconfig br0", "br0       Link encap:Ethernet\n");
    host.tool("ip -6 address show dev br0", "");
    host.tool("ethtool br0", "\tLink detected: yes\n");
    suse.run({"tree"});
    const long before = mostMemory();
    host.tool("brctl show", ToolAnswer{.out = "",
                                       .action = "yes 'br0\t8000.000000000000\tno\t\t" +
                                                 std::string(400, 'x') + "'" + kGigabyte});
    const Finished run = suse.run({"--command-timeout", "500", "tree"});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.out, HasSubstr("network-port:eth0"));
    EXPECT_THAT(run.out, HasSubstr("ip-config:br0"));
    EXPECT_THAT(run.err, HasSubstr("Output too long, the rest is not read: brctl show"));
    EXPECT_LT(mostMemory(), before + kMuchMemory);
}

HOST_TEST(HugeOutput, ThatFillsTmpIsNoLayout) {
    SuseHost suse(host);
    // 13 bytes a line: no number of full pages ends with one.
    host.tool("fdisk -ls", ToolAnswer{.out = "", .action = std::string("yes 'no disk here'") + kGigabyte});
    host.mountOver("/tmp",
                   [] { ASSERT_EQ(mount("small", "/tmp", "tmpfs", MS_NOSUID | MS_NODEV, "size=256k"), 0); });
    const std::vector<std::string> words = suse.commandLine({"tree"});
    for (const bool isOwnTmp : {false, true}) {
        const Finished run = host.run(isOwnTmp ? words : withoutMounts(host, words));
        EXPECT_EQ(run.status, 0);
        EXPECT_THAT(run.err, HasSubstr("Command : fdisk -ls 2>/dev/null > /tmp/fdisk_tmp failed!!"));
        EXPECT_THAT(run.err, HasSubstr("cannot write to /tmp: No space left on device"));
        EXPECT_THAT(run.out, HasSubstr("processor:1"));
        EXPECT_FALSE(host.exists("/tmp/fdisk_tmp"));
    }
}

// Zeros, an escape sequence, bytes that are no UTF-8, and no line break at the end.
const std::string kBinary("\0\x01\x1b[2J\xff\xfe\xc3\x28\x80 eth0 \0\n\xf0\x9f\0 :\xe2\x82", 27);

HOST_TEST(BinaryOutput, OfEveryToolLeavesValidJson) {
    SuseHost suse(host);
    for (const std::string tool : {"ifconfig", "ethtool", "route", "ip", "brctl", "fdisk"}) {
        host.tool(tool + " %any", kBinary);
    }
    for (const std::string command :
         {"ifconfig", "ifconfig -a", "ifconfig eth0", "ethtool eth0", "route -n", "route -A inet6 -n",
          "ip -6 address show dev eth0", "brctl show", "hostname -s", "hostname -d"}) {
        host.tool(command, kBinary);
    }
    host.tool("fdisk -ls", "Disk /dev/sd\xff\x1b[2J: 80.0 GB, 80026361856 bytes\n" + kBinary +
                               "\n/dev/sd\xff"
                               "1   *  1  13  104391  83  Linux\n");
    const Finished run = suse.run({"tree", "--json"});
    EXPECT_EQ(run.status, 0);
    const Json tree = Json::parse(run.out);  // throws at what is no UTF-8
    EXPECT_GE(tree["nodes"].size(), 9U);
    for (const Json& node : tree["nodes"]) {
        const Finished read = suse.run({"get", std::to_string(node["id"].get<int>()), "--json"});
        EXPECT_TRUE(Json::accept(read.out)) << read.out << read.err;
    }
}

HOST_TEST(BinaryOutput, NeverReachesTheTerminal) {
    SuseHost suse(host);
    // The second enters no command, so there is nothing to show of it.
    host.tool("fdisk -ls",
              "Disk /dev/sd\xff\xc2\x9b[2J: 80.0 GB, 80026361856 bytes\n"
              "Disk /dev/sdb\x1b[2J: 80.0 GB, 80026361856 bytes\n");
    const Finished run = suse.run({"tree"});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.out, HasSubstr("hard-drive:sd\\xff\\xc2\\x9b[2J"));
    EXPECT_THAT(run.err, HasSubstr("no command is run with \"Disk /dev/sdb\\x1b[2J: "));
    EXPECT_THAT(run.out + run.err, testing::AllOf(Not(HasSubstr("\x1b")), Not(HasSubstr("\x9b"))));
}

}  // namespace
