// What the service knows of the links of a real kernel, beside what a fresh cvagent finds at the same moment.
#include <gmock/gmock.h>
#include <sys/mount.h>
#include <unistd.h>

#include <cstdlib>
#include <nlohmann/json.hpp>
#include <random>
#include <sstream>

#include "tests/service/service_run.h"
#include "tests/support/waiting.h"

namespace {

using Json = nlohmann::json;
using Lines = std::vector<std::string>;
/// By path: description, status and the properties by id, as text.
using Tree = std::map<std::string, std::map<std::string, std::string>>;

std::string textOf(const Json& value) {
    if (value.is_array()) {
        std::string text;
        for (const Json& each : value) {
            text += (text.empty() ? "" : " ") + textOf(each);
        }
        return text;
    }
    if (value.is_boolean()) {
        return value.get<bool>() ? "1" : "0";
    }
    return value.is_string() ? value.get<std::string>() : value.dump();
}

/// The classes that follow the links.
bool isOfLinks(const std::string& nodeClass) {
    return nodeClass == "network-port" || nodeClass == "ip-config" || nodeClass == "team";
}

class Freshness : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        for (const char* tool : {"ip", "ethtool", "brctl", "hostname"}) {
            host.realTool(tool);
        }
        host.useKernelNetwork();
        host.setHostName("linux-k");
        host.directory("/opt");
        host.file("/etc/hosts", "127.0.0.1 localhost\n127.0.1.1 linux-k.example.com linux-k\n");
        host.file("/etc/resolv.conf", "search example.com\nnameserver 192.0.2.53\n");
    }

    static void ip(FakeHost& host, const Lines& commands) {
        for (const std::string& command : commands) {
            const Finished done = host.run({"sh", "-c", "ip " + command});
            ASSERT_EQ(done.status, 0) << command << ": " << done.err;
        }
    }
    static Lines cable(const std::string& near, const std::string& far) {
        return {"link add " + near + " type veth peer name " + far, "link set " + near + " up",
                "link set " + far + " up"};
    }

    /// The other agents have another data directory: two would lock each other out.
    static void start(FakeHost& host, ServiceRun& run) {
        run.plugin(CORVISTA_PLUGIN_FILE).hostTools("auto").start();
        host.mountOver("/opt", [] { ASSERT_EQ(mount("data", "/opt", "tmpfs", 0, nullptr), 0); });
    }

    static Tree fresh(FakeHost& host) {
        const Finished run = host.run({CVAGENT_PROGRAM, "--plugin", CORVISTA_PLUGIN_FILE, "tree", "--json"});
        EXPECT_EQ(run.status, 0) << run.err;
        Tree tree;
        const Json all = Json::parse(run.out);
        for (const Json& node : all["nodes"]) {
            if (!isOfLinks(node["class"])) {
                continue;
            }
            auto& facts = tree[node["path"]];
            facts["description"] = node["description"];
            facts["status"] = textOf(node["status"]);
            for (const auto& [id, property] : node["properties"].items()) {
                facts[id] = property.contains("value") ? textOf(property["value"]) : "failed";
            }
        }
        return tree;
    }

    static Tree known(ServiceRun& run) {
        const bus::Message answer = call::ask(run.bus(), ServiceRun::kRoot, call::kAgent, "Tree");
        bus::Reader reader(answer);
        Tree tree;
        reader.skip();
        reader.array("(uuuuosssua(uyvtus))", [&] {
            reader.structure("uuuuosssua(uyvtus)", [&] {
                for (int head = 0; head < 5; ++head) {
                    reader.skip();
                }
                const std::string nodeClass = reader.text();
                const std::string path = reader.text();
                std::map<std::string, std::string> facts;
                facts["description"] = reader.text();
                facts["status"] = std::to_string(reader.number());
                for (const ToldReading& each : call::readings(reader)) {
                    facts[std::to_string(each.id)] = each.error.empty() ? each.value : "failed";
                }
                if (isOfLinks(nodeClass)) {
                    tree[path] = facts;
                }
            });
        });
        return tree;
    }

    static std::string differences(const Tree& known, const Tree& fresh) {
        std::string text;
        for (const auto& [path, facts] : fresh) {
            const auto own = known.find(path);
            if (own == known.end()) {
                text += "not known: " + path + "\n";
                continue;
            }
            for (const auto& [name, value] : facts) {
                const auto fact = own->second.find(name);
                const std::string had = fact == own->second.end() ? "nothing" : "'" + fact->second + "'";
                text += had == "'" + value + "'" ? ""
                                                 : path + " " + name + ": " + had + ", not '" + value + "'\n";
            }
            for (const auto& [name, value] : own->second) {
                text += facts.contains(name) ? "" : path + " " + name + ": '" + value + "', not nothing\n";
            }
        }
        for (const auto& [path, facts] : known) {
            text += fresh.contains(path) ? "" : "gone: " + path + "\n";
        }
        return text;
    }

    /// Waits until the service knows what a fresh agent finds; what comes of a change by itself, as a carrier
    /// does, may come between the two.
    /// @return what still differs after ten seconds
    static std::string awaitFresh(FakeHost& host, ServiceRun& run) {
        std::string text;
        for (int tries = 0; tries < 10; ++tries) {
            const Tree wanted = fresh(host);
            const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(1);
            do {
                text = differences(known(run), wanted);
                usleep(5000);
            } while (!text.empty() && std::chrono::steady_clock::now() < end);
            if (text.empty()) {
                break;
            }
        }
        return text;
    }
};

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
    ASSERT_TRUE(known(run).empty());
    ip(host, cable("enp3s0", "sw0"));
    EXPECT_EQ(awaitFresh(host, run), "");
    EXPECT_EQ(known(run).size(), 4U);
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

unsigned int fromEnvironment(const char* name, unsigned int otherwise) {
    const char* const given = std::getenv(name);
    return given != nullptr ? static_cast<unsigned int>(std::strtoul(given, nullptr, 10)) : otherwise;
}

// Read before the fake host takes the environment away.
const unsigned int kChanges = fromEnvironment("CORVISTA_CHANGES", 300);
const unsigned int kSeed = fromEnvironment("CORVISTA_SEED", std::random_device()());

const unsigned int kFlood = fromEnvironment("CORVISTA_FLOOD", 10000);

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
    const unsigned int all = kChanges;
    const unsigned int seed = kSeed;
    SCOPED_TRACE("CORVISTA_SEED=" + std::to_string(seed));
    std::mt19937 random(seed);
    host.run({"ip", "link", "add", "bond0", "type", "bond"});
    ServiceRun run(host);
    start(host, run);
    constexpr unsigned int kAtOnce = 50;
    std::string text;
    std::size_t most = 0;
    for (unsigned int done = 0; done < all && text.empty(); done += kAtOnce) {
        std::string changes;
        for (unsigned int count = 0; count < kAtOnce; ++count) {
            changes += change(random) + "\n";
        }
        host.file("/changes", changes);
        // One by one: a batch ends at a device that is not there.
        host.run({"sh", "-c", "while read -r words; do ip $words; done < /changes"});
        text = awaitFresh(host, run);
        most = std::max(most, known(run).size());
        EXPECT_EQ(text, "") << "after " << done + kAtOnce << " changes, the last:\n" << changes;
    }
    EXPECT_GE(most, 4U) << "hardly any change could be made";
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
    std::printf("%u changes in %.2f s: %.2f s of processor time, %ld kB\n", kFlood, took.count(), cost,
                mostKilobytes(host, service) - memory);
    EXPECT_LT(cost, 0.5 * took.count() + 1) << "in " << took.count() << " s";
#if !defined(__SANITIZE_ADDRESS__)  // which keeps what is freed for a while
    EXPECT_LT(mostKilobytes(host, service) - memory, 16 << 10);
#endif
}

}  // namespace
