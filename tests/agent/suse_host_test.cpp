// cvagent and the real plug-in together: what is read from a SUSE host, and what each write does to it.
#include "tests/agent/suse_host.h"
#include "tests/support/texts_are.h"

#include <gmock/gmock.h>
#include <signal.h>
#include <sys/stat.h>
#include <regex>

#include <nlohmann/json.hpp>

namespace {

using testing::HasSubstr;
using testing::IsEmpty;
using testing::StartsWith;
using Json = nlohmann::ordered_json;

constexpr const char* kIp = "ip-config:eth0";
constexpr const char* kPort =
    "eth0      Link encap:Ethernet  HWaddr 02:00:00:AA:BB:01  \n"
    "          inet addr:192.0.2.10  Bcast:192.0.2.255  Mask:255.255.255.0\n"
    "          UP BROADCAST RUNNING MULTICAST  MTU:1500  Metric:1\n\n";

/// Writes a property and expects it to be done.
Finished write(SuseHost& suse, const std::string& node, const std::string& property,
               const std::vector<std::string>& values) {
    std::vector<std::string> words = {"set", node, property};
    words.insert(words.end(), values.begin(), values.end());
    const Finished run = suse.run(words);
    EXPECT_EQ(run.status, 0) << property << ": " << run.err;
    return run;
}

HOST_TEST(SuseHost, IsShownAsATree) {
    const Finished run = SuseHost(host).run({"tree"});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.err, IsEmpty());
    EXPECT_EQ(run.out, R"(oshw [1]  OsHw Management Interface
`-- root [2]  ROOT Node
    `-- computer [3]  Computer: linux
        `-- chassis [4]
            |-- planar [5]  Planar
            |   |-- disk-controller [7]  Disk Controller
            |   |   |-- hard-drive:sda [8]  Hard Drive: 80.0 GB (74.5 GiB)
            |   |   `-- partition:sda1 [9]  Partition: 106.9 MB (101.9 MiB)
            |   `-- processor:1 [12]  Processor: 2394 MHz
            `-- network-controller [6]  Network Controller
                `-- network-port:eth0 [10]  Network Port: up, 1 Gbit/s
                    `-- ip-config:eth0 [11]  IP Configuration: up, 192.0.2.10, 255.255.255.0, 2001:db8::10
)");
}

HOST_TEST(SuseHost, LeavesNothingButTheStateFileBehind) {
    SuseHost suse(host);
    suse.run({"tree"});
    EXPECT_THAT(host.listDirectory("/tmp"), IsEmpty());
    // A stop in the middle of the monitor's first pass leaves none: what a killed command says is not kept.
    EXPECT_THAT(host.listDirectory("/opt/vantrel/corvista/data"),
                testing::AnyOf(TextsAre(".lock"), TextsAre(".lock", "oshwminetind.dat")));
    EXPECT_THAT(suse.changes(), IsEmpty());
}

HOST_TEST(SuseHost, EveryPropertyOfEveryNodeReads) {
    SuseHost suse(host);
    const Json tree = Json::parse(suse.run({"tree", "--json"}).out);
    ASSERT_EQ(tree["nodes"].size(), 12U);
    for (const Json& node : tree["nodes"]) {
        const Finished run = suse.run({"get", node["path"], "--json"});
        EXPECT_EQ(run.status, 0) << node["path"];
        const Json properties = Json::parse(run.out)["properties"];
        for (const auto& [id, property] : properties.items()) {
            const bool noOwnerYet = node["class"] == "computer" && (id == "115" || id == "116");
            EXPECT_EQ(property.contains("error"), noOwnerYet) << node["path"] << " " << id << " " << property;
            EXPECT_FALSE(std::isdigit(static_cast<unsigned char>(property["name"].get<std::string>()[0])) !=
                         0)
                << node["path"] << " " << id << " is not in the catalogue";
        }
    }
}

HOST_TEST(SuseHost, TheOriginIsWrittenToItsFiles) {
    SuseHost suse(host);
    const Finished run = write(suse, kIp, "IPOrigin", {"1"});
    EXPECT_THAT(run.out, HasSubstr("old  3 (static)\n    new  1 (DHCP)\n"));
    EXPECT_EQ(suse.read(SuseHost::kInterfaceFile),
              "# made by hand\nBOOTPROTO=dhcp\nIPADDR=192.0.2.10\nNETMASK=255.255.255.0\nSTARTMODE='auto'\n");
    EXPECT_EQ(suse.read("/etc/sysconfig/network/config"), "A=1\nNETCONFIG_DNS_POLICY=\"auto\"\nB=2\n");
    EXPECT_THAT(suse.changes(), IsEmpty());
}

HOST_TEST(SuseHost, TheAddressIsWrittenAndTheHostsOwnStillShown) {
    SuseHost suse(host);
    const Finished run = write(suse, kIp, "IPv4Address", {"192.0.2.20"});
    EXPECT_EQ(
        suse.read(SuseHost::kInterfaceFile),
        "# made by hand\nBOOTPROTO='static'\nIPADDR=192.0.2.20\nNETMASK=255.255.255.0\nSTARTMODE='onboot'\n");
    EXPECT_THAT(run.out, HasSubstr("new  192.0.2.10\n"));
    EXPECT_THAT(run.err, HasSubstr("the host still has another value"));
    EXPECT_THAT(suse.changes(), IsEmpty());
}

HOST_TEST(SuseHost, TheMaskIsWrittenAndApplied) {
    SuseHost suse(host);
    suse.follows("ifconfig eth0", kPort, "ifconfig eth0 netmask 255.255.0.0",
                 std::string(kPort).replace(std::string(kPort).find("255.255.255.0\n"), 13, "255.255.0.0"));
    write(suse, kIp, "SubnetMask", {"255.255.0.0"});
    EXPECT_EQ(
        suse.read(SuseHost::kInterfaceFile),
        "# made by hand\nBOOTPROTO='static'\nIPADDR=192.0.2.10\nNETMASK=255.255.0.0\nSTARTMODE='onboot'\n");
    EXPECT_THAT(suse.changes(), TextsAre("ifconfig eth0 netmask 255.255.0.0"));
}

HOST_TEST(SuseHost, TheIpv6AddressIsWrittenToTwoFiles) {
    SuseHost suse(host);
    host.tool("hostname linux.example.com", "");
    write(suse, kIp, "IPv6Address", {"2001:db8::20"});
    EXPECT_EQ(
        suse.read(SuseHost::kInterfaceFile),
        "# made by hand\nBOOTPROTO='static'\nIPADDR=192.0.2.10\nNETMASK=255.255.255.0\nSTARTMODE='onboot'\n"
        "LABEL_1='1'\nIPADDR_1=2001:db8::20\n");
    EXPECT_EQ(suse.read("/etc/hosts"), "127.0.0.1\tlocalhost\n2001:db8::20\tlinux.example.com\tlinux\n");
    EXPECT_THAT(suse.changes(), TextsAre("hostname linux.example.com"));
}

HOST_TEST(SuseHost, ThePrefixLengthIsWritten) {
    SuseHost suse(host);
    write(suse, kIp, "IPv6PrefixLength", {"48"});
    EXPECT_THAT(suse.read(SuseHost::kInterfaceFile),
                testing::EndsWith("STARTMODE='onboot'\nPREFIXLEN_1=48\n"));
    EXPECT_THAT(suse.changes(), IsEmpty());
}

HOST_TEST(SuseHost, NameServersAreWrittenInPlace) {
    SuseHost suse(host);
    const Finished run = write(suse, kIp, "DNSServers", {"192.0.2.54", "2001:db8::53"});
    EXPECT_EQ(suse.read("/etc/resolv.conf"),
              "# resolver\nsearch example.com\nnameserver 192.0.2.54\nnameserver 2001:db8::53\n");
    EXPECT_THAT(run.out, HasSubstr("old  192.0.2.53\n    new  192.0.2.54, 2001:db8::53\n"));
    EXPECT_EQ(run.err, "cvagent: kept over a restart in /etc/resolv.conf\n");
}

HOST_TEST(SuseHost, SearchSuffixesAreWrittenInPlace) {
    SuseHost suse(host);
    const Finished run = write(suse, kIp, "DNSSuffixes", {"example.org", "example.net"});
    EXPECT_EQ(suse.read("/etc/resolv.conf"),
              "# resolver\nsearch example.org example.net\nnameserver 192.0.2.53\n");
    EXPECT_THAT(run.out, HasSubstr("new  example.org, example.net\n"));
}

HOST_TEST(SuseHost, TheHostNameIsSetAndWritten) {
    SuseHost suse(host);
    suse.follows("hostname -s", "linux\n", "hostname earth.example.com", "earth\n");
    write(suse, kIp, "HostName", {"earth"});
    EXPECT_THAT(suse.changes(), TextsAre("hostname earth.example.com"));
    EXPECT_EQ(suse.read("/etc/hosts"), "127.0.0.1\tlocalhost\n192.0.2.10\tearth.example.com\tearth\n");
    EXPECT_EQ(suse.read("/etc/HOSTNAME"), "earth.example.com");
}

HOST_TEST(SuseHost, TheDomainNameIsSetAndWritten) {
    SuseHost suse(host);
    suse.follows("hostname -d", "example.com\n", "hostname linux.example.org", "example.org\n");
    write(suse, kIp, "DomainName", {"example.org"});
    EXPECT_THAT(suse.changes(), TextsAre("hostname linux.example.org"));
    EXPECT_EQ(suse.read("/etc/HOSTNAME"), "linux.example.org");
}

HOST_TEST(SuseHost, TheIpv4GatewayIsWritten) {
    SuseHost suse(host);
    host.tool("route del -host 192.0.2.10 gw 192.0.2.254 eth0", "");
    write(suse, kIp, "IPv4Gateway", {"192.0.2.254"});
    EXPECT_THAT(suse.changes(), TextsAre("route del -host 192.0.2.10 gw 192.0.2.254 eth0"));
    EXPECT_EQ(suse.read("/etc/sysconfig/network/ifroute-eth0"), "192.0.2.10\t192.0.2.254\t-\n");
    EXPECT_EQ(suse.read("/etc/sysconfig/network/routes"), "default\t192.0.2.254\t-\n");
}

HOST_TEST(SuseHost, TheIpv6GatewayIsWritten) {
    SuseHost suse(host);
    host.tool("ip -6 route add default via fe80::2 dev eth0", "");
    suse.follows("route -A inet6 -n", "Kernel IPv6 routing table\n::/0   fe80::1  UG   1024   0  0 eth0\n",
                 "ip -6 route delete default via fe80::1 dev eth0",
                 "Kernel IPv6 routing table\n::/0   fe80::2  UG   1024   0  0 eth0\n");
    write(suse, kIp, "IPv6Gateway", {"fe80::2"});
    EXPECT_THAT(suse.changes(), testing::Contains("ip -6 route add default via fe80::2 dev eth0"));
    EXPECT_EQ(suse.read("/etc/sysconfig/network/routes"), "default\t192.0.2.1\t-\ndefault\tfe80::2\t-\n");
}

HOST_TEST(SuseHost, TheInterfaceIsBroughtUpAndDown) {
    SuseHost suse(host);
    const std::string flags = " > /sys/class/net/eth0/flags";
    host.tool("ifconfig eth0 up", ToolAnswer{.out = "", .action = "echo 0x1003" + flags});
    host.tool("ifconfig eth0 down", ToolAnswer{.out = "", .action = "echo 0x1002" + flags});
    write(suse, kIp, "InterfaceState", {"12"});
    EXPECT_THAT(suse.changes(), TextsAre("ifconfig eth0 down"));
    write(suse, kIp, "InterfaceState", {"up"});
    EXPECT_THAT(suse.changes(), TextsAre("ifconfig eth0 up"));
}

HOST_TEST(SuseHost, PortsAreEnumeratedAgain) {
    SuseHost suse(host);
    EXPECT_THAT(write(suse, kIp, "EnumeratePorts", {"1"}).out, HasSubstr("done"));
    EXPECT_THAT(suse.changes(), IsEmpty());
}

HOST_TEST(SuseHost, TheWritersErrorsAreShown) {
    SuseHost suse(host);
    host.readOnly("/etc/resolv.conf");
    const Finished run = suse.run({"set", kIp, "DNSServers", "192.0.2.54"});
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.err, HasSubstr("Can not open '/etc/resolv.conf' in write mode."));
    EXPECT_THAT(run.out, HasSubstr("new  192.0.2.53\n"));
    EXPECT_THAT(run.err, HasSubstr("DNSServers was not changed, or only in part: it reads '192.0.2.53'; "));
}

HOST_TEST(SuseHost, RefusedValuesLeaveTheHostUntouched) {
    SuseHost suse(host);
    const std::vector<std::string> files = {SuseHost::kInterfaceFile, "/etc/resolv.conf", "/etc/hosts",
                                            "/etc/HOSTNAME", "/etc/sysconfig/network/routes"};
    std::vector<std::string> before;
    for (const std::string& file : files) {
        before.push_back(suse.read(file));
    }
    for (const std::string property :
         {"IPv4Address", "HostName", "DNSServers", "IPv6Gateway", "InterfaceState"}) {
        EXPECT_EQ(suse.run({"set", kIp, property, "$(touch /tmp/broken)"}).status, 4) << property;
        EXPECT_THAT(suse.changes(), IsEmpty()) << property;
    }
    for (std::size_t i = 0; i < files.size(); ++i) {
        EXPECT_EQ(suse.read(files[i]), before[i]);
    }
    EXPECT_FALSE(host.exists("/tmp/broken"));
}

HOST_TEST(SuseComputer, TheOwnerIsKept) {
    SuseHost suse(host);
    EXPECT_THAT(write(suse, "computer", "OwnerContact", {"room 5"}).out, HasSubstr("new  room 5\n"));
    write(suse, "computer", "OwnerName", {"Jürgen O'Neill"});
    EXPECT_EQ(suse.read("/opt/vantrel/corvista/data/asset.dat"),
              "Computer.OwnerContact=room 5\nComputer.OwnerName=Jürgen O'Neill\n");
    EXPECT_THAT(suse.run({"get", "computer", "OwnerName"}).out, HasSubstr("OwnerName  Jürgen O'Neill\n"));
}

HOST_TEST(SuseComputer, ThePowerActionRunsShutdown) {
    SuseHost suse(host);
    write(suse, "computer", "PowerAction", {"1"});
    EXPECT_THAT(suse.changes(), IsEmpty());
    write(suse, "computer", "PowerAction", {"9", "--yes"});
    EXPECT_THAT(suse.changes(), TextsAre("shutdown -r now"));
    write(suse, "computer", "PowerAction", {"12", "--yes"});
    EXPECT_THAT(suse.changes(), TextsAre("shutdown -h now"));
    EXPECT_EQ(suse.run({"set", "computer", "PowerAction", "9"}).status, 2);
    EXPECT_THAT(suse.changes(), IsEmpty());
}

HOST_TEST(SuseComputer, TheClockIsSet) {
    SuseHost suse(host);
    write(suse, "computer", "CurrentTime", {"2026-11-20T21:03:03Z"});
    const std::vector<ClockCall> calls = host.clockCalls();
    ASSERT_EQ(calls.size(), 1U);
    EXPECT_EQ(calls[0].seconds, 1795208583);
    EXPECT_FALSE(calls[0].timeZone);
    host.clockFails(EPERM);
    EXPECT_EQ(suse.run({"set", "computer", "CurrentTime", "2026-11-20T21:03:03Z", "--force"}).status, 1);
}

HOST_TEST(SuseComputer, TheTimeZoneIsSwitched) {
    SuseHost suse(host);
    host.symlink("/etc/localtime", "/usr/share/zoneinfo/GMT");
    const Finished run = write(suse, "computer", "TimeZoneOffset", {"330"});
    EXPECT_EQ(suse.read("/etc/sysconfig/clock"), "HWCLOCK=\"-u\"\nTIMEZONE=\"Asia/Kolkata\"\n");
    EXPECT_THAT(run.out, HasSubstr("old  0 min, UTC+00:00\n"));
    EXPECT_EQ(suse.run({"set", "computer", "TimeZoneOffset", "345"}).status, 4);
}

HOST_TEST(SuseMonitors, AStateChangeAcrossARestartRaisesOneAlert) {
    SuseHost suse(host);
    host.file("/opt/vantrel/corvista/data/oshwminetind.dat", "eth0=12\n");
    RunningProgram watch = host.start(suse.commandLine({"watch", "--json"}));
    ASSERT_TRUE(watch.waitForOutput("}\n"));
    watch.signal(SIGTERM);
    const Finished first = watch.wait();
    EXPECT_EQ(first.status, 0);
    const Json alert = Json::parse(first.out);
    EXPECT_EQ(alert["message"], "NIC is Online ");
    EXPECT_EQ(alert["path"], "/oshw/root/computer/chassis/network-controller/network-port:eth0");
    EXPECT_EQ(alert["codes"].dump(), R"({"first":3,"second":0,"event":1})");
    EXPECT_THAT(suse.run({"watch", "--json", "--for", "2"}).out, IsEmpty());
}

/// A listing without the clock, which goes on from one question to the next.
std::string withoutClock(const std::string& listing) {
    static const std::regex clock(" +126  CurrentTime [^\n]*\n");
    return std::regex_replace(listing, clock, "");
}

/// With the plug-in that lies beside the program.
Finished ask(FakeHost& host, std::vector<std::string> words) {
    words.insert(words.begin(), {CVAGENT_PROGRAM, "--host-tools", "native"});
    return host.run(words, std::chrono::seconds(30));
}

HOST_TEST(SuseHost, TellsTheSameOfANodeWithAndWithoutTheProcessors) {
    const SuseHost suse(host);
    for (const std::string node : {"computer", "eth0", "11", "12", "13", "1", "processor:1",
                                   "/oshw/root/computer/chassis/planar/processor:1",
                                   "/oshw/root/computer/chassis/planar", "processor:2", "", ":1"}) {
        const Finished quick = ask(host, {"get", node});
        const Finished whole = ask(host, {"--log", "/tmp/log", "get", node});
        EXPECT_EQ(withoutClock(quick.out), withoutClock(whole.out)) << node;
        EXPECT_EQ(quick.err, whole.err) << node;
        EXPECT_EQ(quick.status, whole.status) << node;
    }
    EXPECT_THAT(ask(host, {"get", "processor:1"}).out, HasSubstr("2394"));
}

HOST_TEST(SuseHost, AsksForNoProcessorsWhereNothingDependsOnThem) {
    const SuseHost suse(host);
    host.remove("/proc/cpuinfo");
    ASSERT_EQ(mkfifo("/proc/cpuinfo", 0600), 0);  // who reads it waits
    EXPECT_EQ(ask(host, {"get", "computer", "108"}).status, 0);
    EXPECT_EQ(ask(host, {"set", "computer", "116", "somebody"}).status, 0);
}

}  // namespace
