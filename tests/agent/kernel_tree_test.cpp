// cvagent and the real plug-in on links of a real kernel: the tree against what `ip -j` and `ethtool` tell.
#include <gmock/gmock.h>

#include <nlohmann/json.hpp>
#include <thread>

#include "tests/agent/kernel_told.h"
#include "tests/support/fake_host.h"

namespace {

using testing::AnyOf;
using testing::UnorderedElementsAre;
using Json = nlohmann::json;
using Lines = std::vector<std::string>;

const Lines kBesideTheCables = {
    "link add eth2 type veth peer name sw2",  // never brought up
    "link add br0 type bridge",
    "link add br1 type bridge",
    "link set eth4 master br0",
    "link set eth6 master br0",
    "link set sw3 master br1",
    "link set br0 up",
    "link add link eth0 name ethmac type macvlan mode bridge",
    "link set ethmac up",
};

/// Every mix of addresses and routes.
const Lines kAddressesAndRoutes = {
    // everything, several of each; the second IPv4 address has a label of its own
    "address add 10.1.2.3/20 broadcast + dev eth0",
    "address add 10.1.2.4/20 broadcast + dev eth0",
    "address add 192.168.7.1/24 broadcast + dev eth0 label eth0:1",
    "-6 address add 2001:db8:1:9::7/64 dev eth0 nodad valid_lft 3000 preferred_lft 2000",
    "-6 address add 2001:db8:1:42::3/56 dev eth0 nodad",
    "-6 address add 2001:db8:1::4/64 dev eth0 nodad",
    "route add default via 10.1.0.1",
    "route add 172.16.0.0/12 via 10.1.0.2 metric 5",
    "-6 route add default via 2001:db8:1:42::1",
    // on-link routes alone, no broadcast address
    "address add 10.9.0.1/30 dev eth1",
    // IPv6 alone, all of it learnt
    "-6 address add 2001:db8:3:1::1/60 dev eth3 nodad valid_lft 3000 preferred_lft 2000",
    "-6 address add 2001:db8:3:2::1/62 dev eth3 nodad valid_lft 3000 preferred_lft 2000",
    "-6 route add 2001:db8:f::/48 via 2001:db8:3:1::ff dev eth3",
    // a default route of its own behind the first one
    "address add 10.5.0.2/16 broadcast + dev eth5",
    "route add default via 10.5.0.1 dev eth5 metric 200",
    "-6 route add default via fe80::1 dev eth5 metric 2048",
    // on the links above the ports
    "address add 10.6.0.1/25 broadcast + dev br0",
    "-6 address add 2001:db8:6::1/64 dev br0 nodad",
    "address add 10.1.2.9/32 dev ethmac",
};

/// The values of a node: property id to value.
Json values(const Json& node) {
    Json found = Json::object();
    for (const auto& [id, property] : node["properties"].items()) {
        if (property.contains("value")) {
            found[id] = property["value"];
        }
    }
    return found;
}

/// Of values only those that are told; null for one that is not there.
Json onlyTold(const Json& values, const Json& told) {
    Json found = Json::object();
    for (const auto& [id, value] : told.items()) {
        found[id] = values.value(id, Json());
    }
    return found;
}

/// A host whose network is the kernel's, in a namespace of its own. The far ends of its cables ("sw0"...)
/// are in the same.
class KernelTree : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        for (const char* tool : {"ip", "ethtool", "brctl", "hostname"}) {
            host.realTool(tool);
        }
        host.useKernelNetwork();
        host.directory("/opt/vantrel/corvista/data");
        host.setHostName("linux-k");
        host.file("/etc/hosts", "127.0.0.1 localhost\n10.1.2.3 linux-k.example.com linux-k\n");
        host.file("/etc/resolv.conf",
                  "search example.com example.org\nnameserver 192.0.2.53\nnameserver 2001:db8::53\n");
    }

    static Finished ip(FakeHost& host, const std::string& words) {
        return host.run({"sh", "-c", "ip " + words});
    }
    static void wire(FakeHost& host, const Lines& commands) {
        for (const std::string& command : commands) {
            const Finished done = ip(host, command);
            ASSERT_EQ(done.status, 0) << command << ": " << done.err;
        }
    }
    /// A cable between two links, the near end up.
    static Lines cable(const std::string& near, const std::string& far, bool plugged = true) {
        Lines commands = {"link add " + near + " type veth peer name " + far, "link set " + near + " up"};
        if (plugged) {
            commands.push_back("link set " + far + " up");
        }
        return commands;
    }
    static void wireEverything(FakeHost& host) {
        for (const std::string number : {"0", "1", "3", "4", "5", "6"}) {
            wire(host, cable("eth" + number, "sw" + number, number != "1"));
        }
        wire(host, kBesideTheCables);
        wire(host, kAddressesAndRoutes);
    }
    static void interfaceFile(FakeHost& host, const std::string& name, const std::string& content) {
        host.file("/etc/sysconfig/network/ifcfg-eth-id-" + KernelTold(host).hardwareAddress(name), content);
    }

    static Json cvagent(FakeHost& host, Lines words) {
        words.insert(words.begin(), {CVAGENT_PROGRAM, "--plugin", CORVISTA_PLUGIN_FILE});
        words.emplace_back("--json");
        const Finished run = host.run(words);
        EXPECT_EQ(run.status, 0) << run.err;
        EXPECT_THAT(run.err,
                    AnyOf("", "cvagent: links of the kernel that the tree has no node for: 'vxeth0'\n"));
        return Json::parse(run.out);
    }
    /// The network's nodes of the tree, in the form of KernelTold.
    static Json shown(FakeHost& host) {
        Json found = Json::object();
        const Json tree = cvagent(host, {"tree"});
        for (const Json& node : tree["nodes"]) {
            const std::string type = node["class"];
            if (type != "network-port" && type != "ip-config" && type != "team") {
                continue;
            }
            found[node["path"].get<std::string>()] = {{"description", node["description"]},
                                                      {"status", node["status"]},
                                                      {"properties", values(node)}};
        }
        return found;
    }
    static void expectTreeAsTold(FakeHost& host) {
        const Json expected = KernelTold(host).nodes();
        Json found = shown(host);
        for (const auto& [path, node] : expected.items()) {
            if (found.contains(path)) {
                found[path]["properties"] = onlyTold(found[path]["properties"], node["properties"]);
            }
        }
        EXPECT_EQ(found, expected) << "the way from what is told to what is shown: "
                                   << Json::diff(expected, found).dump(1);
    }
    /// The names of the nodes that a tree shows, without the way to them and the far ends of cables.
    static Lines names(const Json& nodes) {
        Lines found;
        for (const auto& [path, node] : nodes.items()) {
            const std::string name = path.substr(path.rfind('/') + 1);
            if (name.find(":sw") == std::string::npos) {
                found.push_back(name);
            }
        }
        return found;
    }
};

HOST_TEST_F(KernelTree, EqualsWhatTheToolsTell) {
    wireEverything(host);
    interfaceFile(host, "eth0", "BOOTPROTO=static\n");
    interfaceFile(host, "eth5", "STARTMODE=auto\nBOOTPROTO=dhcp\n");
    expectTreeAsTold(host);
    EXPECT_THAT(names(KernelTold(host).nodes()),
                UnorderedElementsAre("network-port:eth0", "ip-config:eth0", "network-port:eth1",
                                     "ip-config:eth1", "network-port:eth2", "ip-config:eth2",
                                     "network-port:eth3", "ip-config:eth3", "network-port:eth5",
                                     "ip-config:eth5", "ip-config:br0", "ip-config:br1", "ip-config:ethmac"))
        << "no bridge's member";
}

HOST_TEST_F(KernelTree, ReadsLiveWhatTheToolsTellNow) {
    wire(host, cable("eth0", "sw0"));
    wire(host, {"address add 10.1.2.3/20 broadcast + dev eth0", "route add default via 10.1.0.1",
                "-6 address add 2001:db8:1:42::3/56 dev eth0 nodad", "link set sw0 down"});
    const KernelTold told(host);
    ASSERT_EQ(told.liveState("eth0"), 12U) << "its cable is dead";
    const Json nodes = told.nodes();
    for (const auto& [path, node] : nodes.items()) {
        Json expected = node["properties"];
        expected["123"] = 12;
        EXPECT_EQ(onlyTold(values(cvagent(host, {"get", path})), expected), expected) << path;
    }
    EXPECT_EQ(nodes.size(), 4U) << "both ends of the cable";
}

/// One interface of each way in which today's systems name theirs, and beside them what has a name that could
/// be taken for a wired one.
void wireTodaysNames(FakeHost& host) {
    for (const char* command :
         {"link add enp0s31f6 type veth peer name sw0", "link add ens18 type veth peer name sw1",
          "link add eno1np0 type veth peer name sw2", "link add enx001122334455 type veth peer name sw3",
          "link add wan0 type veth peer name sw4", "link set enp0s31f6 up", "link set ens18 up",
          "link set sw0 up", "link add br0 type bridge", "link set wan0 master br0",
          "link add vethdocker type veth peer name cont0", "link set vethdocker master br0",
          "link add vxeth0 type vxlan id 5 dstport 4789 remote 192.0.2.1", "link set br0 up",
          "address add 10.1.2.3/20 broadcast + dev ens18",
          "address add 10.9.2.3/20 broadcast + dev enp0s31f6", "route add default via 10.1.0.1"}) {
        const Finished done = host.run({"sh", "-c", std::string("ip ") + command});
        ASSERT_EQ(done.status, 0) << command << ": " << done.err;
    }
}

HOST_TEST_F(KernelTree, ShowsInterfacesWithTodaysNames) {
    wireTodaysNames(host);
    expectTreeAsTold(host);
    EXPECT_THAT(names(shown(host)),
                UnorderedElementsAre("network-port:enp0s31f6", "ip-config:enp0s31f6", "network-port:ens18",
                                     "ip-config:ens18", "network-port:eno1np0", "ip-config:eno1np0",
                                     "network-port:enx001122334455", "ip-config:enx001122334455",
                                     "network-port:cont0", "ip-config:cont0", "ip-config:br0"));
}

HOST_TEST_F(KernelTree, WritesAnInterfaceWithOneOfTodaysNames) {
    wireTodaysNames(host);
    const std::string start = "BOOTPROTO=static\nIPADDR=10.1.2.3/20\n";
    interfaceFile(host, "ens18", start);
    const std::string file =
        "/etc/sysconfig/network/ifcfg-eth-id-" + KernelTold(host).hardwareAddress("ens18");
    const auto write = [&](const std::string& property, const std::string& value) {
        const Finished run = host.run({CVAGENT_PROGRAM, "--plugin", CORVISTA_PLUGIN_FILE, "set",
                                       "ip-config:ens18", property, value, "--yes"});
        EXPECT_EQ(run.status, 0) << run.err;
    };
    write("IPv4Address", "10.1.2.9");
    EXPECT_THAT(host.read(file).value_or(""), testing::HasSubstr("IPADDR=10.1.2.9\n"));
    write("InterfaceState", "12");
    EXPECT_FALSE(KernelTold(host).nodes().empty());
    EXPECT_THAT(ip(host, "-o link show ens18").out, testing::Not(testing::HasSubstr("UP")));
    write("InterfaceState", "1");
    EXPECT_THAT(ip(host, "-o link show ens18").out, testing::HasSubstr(",UP"));
}

/// With a user's own rights, each property that can be written.
HOST_TEST_F(KernelTree, ChangesNothingWithoutRootAndSaysSo) {
    wire(host, cable("eth0", "sw0"));
    wire(host, {"address add 10.1.2.3/20 broadcast + dev eth0", "route add default via 10.1.0.1",
                "-6 address add 2001:db8:1:42::3/56 dev eth0 nodad"});
    interfaceFile(host, "eth0", "BOOTPROTO=static\nIPADDR=10.1.2.3/20\n");
    host.file("/etc/sysconfig/network/routes", "default\t10.1.0.1\t-\n");
    host.file("/etc/HOSTNAME", "linux-k.example.com");
    host.directory("/home/x");
    if (!host.giveToStranger("/home/x")) {
        GTEST_SKIP() << "the tests do not run as root";
    }
    host.realTool("setpriv");
    const auto asStranger = [&host](const Lines& words) {
        Lines line = {"setpriv",      "--reuid=12345", "--regid=12345", "--keep-groups",     "env",
                      "HOME=/home/x", CVAGENT_PROGRAM, "--plugin",      CORVISTA_PLUGIN_FILE};
        line.insert(line.end(), words.begin(), words.end());
        return host.run(line);
    };
    const auto network = [&host] {
        return ip(host, "-4 -o address show up").out + ip(host, "route show").out +
               ip(host, "-6 route show default").out;
    };
    const std::string before = network();
    for (const auto& [property, value] : std::map<std::string, std::string>{{"InterfaceState", "down"},
                                                                            {"IPOrigin", "1"},
                                                                            {"IPv4Address", "10.1.2.4"},
                                                                            {"SubnetMask", "255.255.255.0"},
                                                                            {"IPv6Address", "2001:db8::20"},
                                                                            {"IPv6PrefixLength", "48"},
                                                                            {"IPv4Gateway", "10.1.0.2"},
                                                                            {"IPv6Gateway", "fe80::2"},
                                                                            {"DNSServers", "192.0.2.54"},
                                                                            {"DNSSuffixes", "example.net"},
                                                                            {"HostName", "earth"},
                                                                            {"DomainName", "example.net"}}) {
        const Finished run = asStranger({"set", "ip-config:eth0", property, value});
        EXPECT_EQ(run.status, 1) << property << run.out;
        EXPECT_THAT(run.err, testing::HasSubstr(property + " was not changed"));
    }
    EXPECT_THAT(asStranger({"set", "computer", "PowerAction", "9", "--yes"}).err,
                testing::HasSubstr("PowerAction was not changed"));
    EXPECT_EQ(asStranger({"set", "computer", "TimeZoneOffset", "330"}).status, 1);
    EXPECT_EQ(asStranger({"set", "computer", "OwnerName", "x"}).status, 0) << "the user's own data";
    EXPECT_EQ(network(), before);
    EXPECT_EQ(host.read("/etc/HOSTNAME").value_or(""), "linux-k.example.com");
}

HOST_TEST_F(KernelTree, TellsOfAnInterfaceWithOneOfTodaysNames) {
    wireTodaysNames(host);
    wire(host, {"link set sw1 up", "link set ens18 up"});
    host.file("/opt/vantrel/corvista/data/oshwminetind.dat", "ens18=12\n");
    RunningProgram watch = host.start({CVAGENT_PROGRAM, "--plugin", CORVISTA_PLUGIN_FILE, "watch", "--json"});
    EXPECT_TRUE(watch.waitForOutput("}\n"));
    watch.signal(SIGTERM);
    const Json alert = Json::parse(watch.wait().out);
    EXPECT_EQ(alert["message"], "NIC is Online ");
    EXPECT_THAT(alert["path"].get<std::string>(), testing::HasSubstr("ens18"));
}

/// The host without net-tools, ethtool and bridge-utils.
HOST_TEST_F(KernelTree, IsTheSameOnABareHost) {
    wireTodaysNames(host);
    wire(host, cable("eth0", "sw7"));
    const Json equipped = shown(host);
    for (const char* tool : {"ethtool", "brctl"}) {
        host.toolMissing(tool);
    }
    EXPECT_EQ(host.run({"sh", "-c", "command -v ethtool brctl ifconfig route"}).out, "");
    const Json bare = shown(host);
    EXPECT_EQ(bare, equipped) << Json::diff(equipped, bare).dump(1);
    EXPECT_GT(equipped.size(), 10U);
}

/// As in a rescue system, or where a distribution is put together.
HOST_TEST_F(KernelTree, IsTheSameBelowAnotherRoot) {
    wireTodaysNames(host);
    for (const char* tool : {"chroot", "mount"}) {
        host.realTool(tool);
    }
    host.directory("/srv/root");
    const Finished bound = host.run({"mount", "--rbind", "/", "/srv/root"});
    ASSERT_EQ(bound.status, 0) << bound.err;
    const Lines tree = {CVAGENT_PROGRAM, "--plugin", CORVISTA_PLUGIN_FILE, "tree"};
    Lines below = {"chroot", "/srv/root"};
    below.insert(below.end(), tree.begin(), tree.end());
    const Finished run = host.run(below);
    EXPECT_EQ(run.out, host.run(tree).out);
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.out, testing::HasSubstr("network-port:ens18"));
}

/// The words with which doctor compares.
const Lines kVerify = {CVAGENT_PROGRAM, "--plugin", CORVISTA_PLUGIN_FILE, "doctor", "--verify", "--json"};

HOST_TEST_F(KernelTree, IsVerifiedByDoctorWithoutTheTools) {
    wireTodaysNames(host);
    wire(host, cable("eth0", "sw7"));
    const Finished run = host.run(kVerify);
    const Json verdict = Json::parse(run.out);
    EXPECT_GT(verdict["compared"], 50);
    for (const Json& difference : verdict["differences"]) {
        EXPECT_EQ(difference["property"], "processors") << "the recorded /proc/cpuinfo: " << difference;
    }
}

HOST_TEST_F(KernelTree, IsFoundWrongWhereOneNameIsPartOfAnother) {
    wire(host, cable("eth1", "sw1"));
    wire(host, cable("eth10", "sw10"));
    wire(host, {"address add 10.1.2.3/24 dev eth1", "address add 10.1.10.3/24 dev eth10"});
    host.tool("ethtool %any", "");
    host.tool("ethtool eth1", "Settings for eth1:\n\tSpeed: 100Mb/s\n\tDuplex: Half\n\tLink detected: no\n");
    const Finished run = host.run(kVerify);
    EXPECT_EQ(run.status, 1);
    const Json verdict = Json::parse(run.out);
    std::map<std::string, Json> ofEth1;
    for (const Json& difference : verdict["differences"]) {
        if (difference["path"].get<std::string>().ends_with("network-port:eth1")) {
            ofEth1[difference["property"]] = difference;
        }
    }
    ASSERT_TRUE(ofEth1.contains("LinkSpeed")) << verdict.dump(1);
    EXPECT_EQ(ofEth1["LinkSpeed"]["shown"], "100000");
    EXPECT_EQ(ofEth1["LinkSpeed"]["kernel"], "10000000");
    EXPECT_EQ(ofEth1["LinkState"]["kernel"], "1");
    EXPECT_TRUE(ofEth1.contains("FullDuplex"));
    EXPECT_THAT(ofEth1["LinkSpeed"]["why"].get<std::string>(), testing::HasSubstr("part of 'eth10'"));
}

/// Links that not every kernel has; their test says so and is skipped there.
bool hasKind(FakeHost& host, const std::string& command) {
    const Finished done = host.run({"sh", "-c", "ip " + command});
    EXPECT_TRUE(done.status == 0 || done.err.find("Unknown device type") != std::string::npos) << done.err;
    return done.status == 0;
}

HOST_TEST_F(KernelTree, EqualsWhatTheToolsTellOfVLANs) {
    wire(host, cable("eth0", "sw0"));
    if (!hasKind(host, "link add link eth0 name eth0.10 type vlan id 10")) {
        GTEST_SKIP() << "this kernel has no VLANs";
    }
    wire(host, {"link add link eth0 name eth0.20 type vlan id 20", "link set eth0.10 up",
                "address add 10.10.0.1/24 broadcast + dev eth0.10"});
    expectTreeAsTold(host);
    EXPECT_THAT(names(KernelTold(host).nodes()),
                UnorderedElementsAre("network-port:eth0", "ip-config:eth0", "network-port:eth0.10",
                                     "ip-config:eth0.10", "network-port:eth0.20", "ip-config:eth0.20"));
}

HOST_TEST_F(KernelTree, EqualsWhatTheToolsTellOfABond) {
    if (!hasKind(host, "link add bond0 type bond mode active-backup miimon 20")) {
        GTEST_SKIP() << "this kernel has no bonds";
    }
    for (const std::string number : {"0", "1"}) {
        wire(host, cable("eth" + number, "sw" + number));
        wire(host, {"link set eth" + number + " down", "link set eth" + number + " master bond0"});
    }
    wire(host, {"link set bond0 up", "address add 10.2.0.1/24 broadcast + dev bond0"});
    interfaceFile(host, "bond0", "SLAVE=yes\nMASTER=bond0\n");
    std::this_thread::sleep_for(std::chrono::milliseconds(500));  // the driver looks at its members every 20
    expectTreeAsTold(host);
    EXPECT_THAT(names(KernelTold(host).nodes()),
                UnorderedElementsAre("network-port:eth0", "ip-config:eth0", "network-port:eth1",
                                     "ip-config:eth1", "ip-config:bond0", "team:bond0"));
}

}  // namespace
