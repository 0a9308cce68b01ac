// What the service knows of the links of a real kernel, beside what a fresh cvagent finds at the same moment.
#include <random>

#include "tests/service/fresh_tree.h"
#include "tests/support/amounts.h"
#include "tests/support/waiting.h"

namespace {

HOST_TEST_F(Freshness, AnAddressIsThereAtOnce) {
    ip(host, cable("eth0", "sw0"));
    ServiceRun run(host);
    start(host, run);
    ASSERT_EQ(awaitFresh(host, run), "");
    ip(host, {"address add 10.1.2.3/20 dev eth0", "-6 address add 2001:db8:1:9::7/64 dev eth0 nodad"});
    EXPECT_EQ(awaitFresh(host, run), "");
    ip(host, {"route add default via 10.1.0.1", "address del 2001:db8:1:9::7/64 dev eth0"});
    EXPECT_EQ(awaitFresh(host, run), "");
    ip(host, {"link set sw0 down"});
    EXPECT_EQ(awaitFresh(host, run), "");
    ip(host, {"link set eth0 down"});
    EXPECT_EQ(awaitFresh(host, run), "");
}

HOST_TEST_F(Freshness, LinksComeAndGo) {
    ip(host, cable("eth0", "sw0"));
    ServiceRun run(host);
    start(host, run);
    ip(host, cable("enp3s0", "sw1"));
    EXPECT_EQ(awaitFresh(host, run), "");
    ip(host, {"link del enp3s0"});
    EXPECT_EQ(awaitFresh(host, run), "");
    ip(host, cable("enp3s0", "sw1"));
    EXPECT_EQ(awaitFresh(host, run), "");
    ip(host, {"link set eth0 down", "link set eth0 name enp9s0"});
    EXPECT_EQ(awaitFresh(host, run), "");
    ip(host, {"link add br0 type bridge", "link set enp9s0 master br0"});
    EXPECT_EQ(awaitFresh(host, run), "");
    ip(host, {"link set enp9s0 nomaster"});
    EXPECT_EQ(awaitFresh(host, run), "");
}

/// The second plug-in hears the kernel by itself and tells nobody which facts are others now.
HOST_TEST_F(Freshness, FactsOfTheSecondPluginFollow) {
    ip(host, cable("eth0", "sw0"));
    ServiceRun run(host);
    run.plugin(HARDWARE_FILE).start();
    const char* const kLink = "/com/vantrel/Corvista1/hardware/link_3aeth0";
    ASSERT_EQ(call::get(run.bus(), kLink, "com.vantrel.Corvista1.Link", "MTU"), "1500");
    ip(host, {"link set eth0 mtu 1400"});
    EXPECT_TRUE(eventually([&] {
        usleep(10000);
        return call::get(run.bus(), kLink, "com.vantrel.Corvista1.Link", "MTU") == "1400";
    }));
}

/// Where nothing was to be seen at the start, the plug-in has no node through which it could be asked to
/// look.
HOST_TEST_F(Freshness, TheFirstLinkMayComeAfterTheStart) {
    ServiceRun run(host);
    start(host, run);
    ASSERT_EQ(linkNodesIn(known(run)), 0);
    ip(host, cable("enp3s0", "sw0"));
    EXPECT_EQ(awaitFresh(host, run), "");
    EXPECT_EQ(linkNodesIn(known(run)), 4);
}

/// The plug-in has listed a link that is gone, or another one, when the service hears of links for the first
/// time.
HOST_TEST_F(Freshness, ALinkThatGoesDuringTheStartGoes) {
    const auto once = [](const std::string& name, const std::string& script) {
        const std::string mark = "/looked-at-" + name;
        return ToolAnswer{"", 0, "", 0,
                          "if [ ! -e " + mark + " ]; then touch " + mark + "; " + script + "; fi"};
    };
    host.tool("ethtool %any", "");
    host.tool("ethtool eth6", once("eth6", "ip link del eth6"));
    host.tool("ethtool eth7", once("eth7", "ip link del eth7; ip link add eth7 type bridge"));
    for (const char* name : {"eth0", "eth6", "eth7"}) {
        ip(host, cable(name, std::string("sw") + name));
    }
    ServiceRun run(host);
    start(host, run);
    ASSERT_TRUE(host.exists("/looked-at-eth7"));
    EXPECT_EQ(awaitFresh(host, run), "");
}

HOST_TEST_F(Freshness, ABondThatComesIsATeam) {
    ip(host, cable("eth0", "sw0"));
    ServiceRun run(host);
    start(host, run);
    if (host.run({"ip", "link", "add", "bond7", "type", "bond"}).status != 0) {
        GTEST_SKIP() << "this kernel has no bonds";
    }
    ip(host, {"link set eth0 down master bond7", "link set bond7 up"});
    EXPECT_EQ(awaitFresh(host, run), "");
    EXPECT_TRUE(known(run).contains("/oshw/root/computer/team:bond7"));
    ip(host, {"link del bond7"});
    EXPECT_EQ(awaitFresh(host, run), "");
}

const auto kChanges = numberFrom("CORVISTA_CHANGES", 300);
const auto kSeed = seedOfRun();
const auto kFlood = numberFrom("CORVISTA_FLOOD", 10000);

/// One change of the network, at random. Some cannot be done.
std::string change(std::mt19937& random) {
    const auto pick = [&random](std::size_t count) { return random() % count; };
    static const Lines kNames = {"eth0", "eth1", "eth10", "enp3s0", "enp4s0f1",
                                 "br0",  "br1",  "vlan7", "bond1"};
    const std::string one = kNames[pick(kNames.size())];
    const std::string two = kNames[pick(kNames.size())];
    const std::string number = std::to_string(1 + pick(3));
    const std::string address = "10." + number + ".0." + number + "/24 dev " + one;
    const std::string address6 = "2001:db8:" + number + ":" + number + "::1/64 dev " + one;
    const Lines changes = {
        "link add " + one + " type veth peer name sw" + number,
        "link add " + one + " type veth peer name " + two,
        "link add br" + number + " type bridge",
        "link add bond" + number + " type bond",
        "link add " + two + " link " + one + " type vlan id " + number,
        "link add " + two + " link " + one + " type macvlan",
        "link del " + one,
        "link set " + one + " up",
        "link set sw" + number + " up",
        "link set " + one + " down",
        "link set sw" + number + " down",
        "link set " + one + " nomaster",
        "link set " + one + " master " + two,
        "link set " + one + " down master bond" + std::to_string(pick(3)),
        "link set " + one + " down name " + two,
        "address add " + address,
        "address del " + address,
        "-6 address add " + address6 + " nodad",
        "-6 address del " + address6,
        "route add default via 10." + number + ".0.254 dev " + one,
        "route del default dev " + one,
        "-6 route add default via fe80::" + number + " dev " + one,
        "-6 route del default dev " + one,
    };
    return changes[pick(changes.size())];
}

HOST_TEST_F(Freshness, IsTheSameAfterRandomChanges) {
    SCOPED_TRACE("CORVISTA_SEED=" + std::to_string(kSeed));
    std::mt19937 random(kSeed);
    host.run({"ip", "link", "add", "bond0", "type", "bond"});
    ServiceRun run(host);
    start(host, run);
    constexpr unsigned int kAtOnce = 50;
    std::string text;
    long most = 0;
    for (unsigned int done = 0; done < kChanges && text.empty(); done += kAtOnce) {
        std::string changes;
        for (unsigned int count = 0; count < kAtOnce; ++count) {
            changes += change(random) + "\n";
        }
        host.file("/changes", changes);
        // One by one: a batch ends at a device that is not there.
        host.run({"sh", "-c", "while read -r words; do ip $words; done < /changes"});
        text = awaitFresh(host, run);
        most = std::max(most, linkNodesIn(known(run)));
        EXPECT_EQ(text, "") << "after " << done + kAtOnce << " changes, the last:\n"
                            << changes << host.run({"ip", "-d", "link"}).out;
    }
    EXPECT_GE(most, 4) << "hardly any change could be made";
}

/// Seconds of processor time of a process and all that it has started and waited for.
double processorSeconds(FakeHost& host, pid_t process) {
    const std::string line = host.read("/proc/" + std::to_string(process) + "/stat").value_or("");
    std::istringstream words(line.substr(line.rfind(')') + 1));
    std::string word;
    double ticks = 0;
    for (int place = 3; place <= 17 && words >> word; ++place) {
        ticks += place >= 14 ? std::stod(word) : 0;
    }
    return ticks / static_cast<double>(sysconf(_SC_CLK_TCK));
}

long mostKilobytes(FakeHost& host, pid_t process) {
    const std::string status = host.read("/proc/" + std::to_string(process) + "/status").value_or("");
    return std::stol(status.substr(status.find("VmHWM:") + 6));
}

/// CORVISTA_FLOOD says how many: 10,000 without a word, as fast as `ip` makes them.
HOST_TEST_F(Freshness, AFloodCostsLittleAndEndsRight) {
    ip(host, cable("eth0", "sw0"));
    ip(host, cable("eth1", "sw1"));
    ServiceRun run(host);
    start(host, run);
    ASSERT_EQ(awaitFresh(host, run), "");
    std::string changes;
    for (unsigned int count = 0; count < kFlood / 4; ++count) {
        changes +=
            "address add 10.1.0.1/24 dev eth0\nlink set sw0 down\naddress del 10.1.0.1/24 dev eth0\nlink set "
            "sw0 up\n";
    }
    host.file("/changes", changes + "address add 10.9.0.1/24 dev eth1\n");
    const pid_t service = run.program().pid();
    const double before = processorSeconds(host, service);
    const long memory = mostKilobytes(host, service);
    const auto begun = std::chrono::steady_clock::now();
    host.run({"ip", "-force", "-batch", "/changes"});
    const std::chrono::duration<double> took = std::chrono::steady_clock::now() - begun;
    EXPECT_EQ(awaitFresh(host, run), "");
    const double cost = processorSeconds(host, service) - before;
    std::printf("%lu changes in %.2f s: %.2f s of processor time, %ld kB\n", kFlood, took.count(), cost,
                mostKilobytes(host, service) - memory);
    EXPECT_LT(cost, 0.5 * took.count() + 1) << "in " << took.count() << " s";
#if !defined(__SANITIZE_ADDRESS__)  // which keeps what is freed for a while
    EXPECT_LT(mostKilobytes(host, service) - memory, 16 << 10);
#endif
}

}  // namespace
