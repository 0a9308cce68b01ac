// Links of a network of its own beside what `ip` tells of them, also while they come, go and change.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <condition_variable>
#include <cstdlib>
#include <fstream>
#include <mutex>
#include <nlohmann/json.hpp>
#include <random>

#include "plugins/hardware/hardware_mi.h"
#include "tests/hardware/beside_ip.h"
#include "tests/hardware/golden.h"
#include "tests/hardware/recorded_host.h"
#include "tests/support/amounts.h"
#include "tests/support/waiting.h"

namespace {

using hardware::Class;
using hardware::Watcher;
using Json = nlohmann::json;
using testing::Contains;
using testing::UnorderedElementsAre;

const auto kChanges = numberFrom("CORVISTA_CHANGES", 300);
const auto kSeed = seedOfRun();

/// Moves this process, before it has threads of its own, into a network and a /sys of its own.
bool enterOwnNetwork() {
    const uid_t user = geteuid();
    const gid_t group = getegid();
    const bool own = unshare(CLONE_NEWUSER | CLONE_NEWNS | CLONE_NEWNET) == 0;
    if (own) {
        std::ofstream("/proc/self/setgroups") << "deny";
        std::ofstream("/proc/self/uid_map") << "0 " << user << " 1";
        std::ofstream("/proc/self/gid_map") << "0 " << group << " 1";
    }
    return (own || unshare(CLONE_NEWNS | CLONE_NEWNET) == 0) &&
           mount("", "/", "", MS_REC | MS_PRIVATE, nullptr) == 0 &&
           mount("none", "/sys", "sysfs", 0, nullptr) == 0;
}

bool ip(const std::string& words) {
    return std::system(("ip " + words + " 2>/dev/null").c_str()) == 0;
}

class Links : public testing::Test {
protected:
    static void SetUpTestSuite() {
        static const bool entered = enterOwnNetwork();
        entered_ = entered && ip("link show lo >/dev/null");
    }
    void SetUp() override {
        if (!entered_) {
            GTEST_SKIP() << "this machine allows no network of its own, or has no ip";
        }
    }
    void TearDown() override {
        for (const std::string& name : listed(host_, Class::link)) {
            ip("link del dev '" + name + "'");
        }
    }
    std::string fact(const std::string& link, const std::string& property) const {
        return told(host_, Class::link, link, property);
    }
    /// The facts that do not change by themselves, by link.
    std::map<std::string, std::string> fresh() const {
        std::map<std::string, std::string> all;
        for (const std::string& name : listed(host_, Class::link)) {
            hardware::Found found{Class::link, name};
            found.facts.text(hardware::firstId(Class::link), name);
            sourceOf(Class::link).describe(host_, found);
            all[name] = steady(found.facts.all());
        }
        return all;
    }
    static std::map<std::string, std::string> ofTree(hardware::HardwareMI& plugin) {
        std::map<std::string, std::string> all;
        for (const auto& node : plugin.holdAll()) {
            if (node->nodeType() == static_cast<unsigned int>(Class::link)) {
                hardware::Facts::Map facts;
                node->getProperties(facts);
                all[golden::text(facts.at(hardware::firstId(Class::link)))] = steady(facts);
            }
        }
        return all;
    }
    static std::string steady(hardware::Facts::Map facts) {
        std::erase_if(facts, [](const auto& fact) {
            const auto rows = hardware::allRows();
            return std::any_of(rows.begin(), rows.end(), [&](const hardware::Row& row) {
                return row.id == fact.first && row.traits.live && std::string(row.name) != "Master" &&
                       std::string(row.name) != "Carrier";
            });
        });
        return golden::facts(facts, "  ");
    }

    static inline bool entered_ = false;
    const hardware::Host host_;
};

TEST_F(Links, AreOfTheKindThatIpNames) {
    ip("link add veth0 type veth peer name veth1");
    for (const char* kind : {"bridge", "bond", "dummy", "ifb", "team", "nlmon", "vrf table 9", "wireguard"}) {
        ip(std::string("link add my") + kind[0] + kind[1] + " type " + kind);
    }
    ip("link add vlan7 link veth0 type vlan id 7");
    ip("link add macvlan0 link veth0 type macvlan");
    ip("link add vxlan0 type vxlan id 4 dstport 4789");
    ip("tuntap add tun0 mode tun");
    ip("tuntap add tap0 mode tap");
    const Json all = Json::parse(hardware_test::printed("ip -j -d link"));
    EXPECT_GE(all.size(), 3U);
    for (const Json& link : all) {
        const std::string name = link["ifname"];
        const std::string kind = link.contains("linkinfo") && link["linkinfo"].contains("info_kind")
                                     ? link["linkinfo"]["info_kind"].get<std::string>()
                                     : "loopback";
        EXPECT_EQ(fact(name, "LinkKind"), kind) << name;
    }
}

TEST_F(Links, HaveTheValuesThatIpAndEthtoolTell) {
    ip("link set lo up");
    ip("link add veth0 numrxqueues 3 type veth peer name veth1");
    ip("link add br0 type bridge");
    ip("link set veth0 up mtu 1400 master br0");
    ip("link set veth1 up address 02:00:00:00:00:07");
    ip("link set br0 up");
    const auto all = [this] {
        std::vector<std::string> differing;
        for (const Json& link : Json::parse(hardware_test::printed("ip -j -d -s -s link"))) {
            const std::string name = link["ifname"];
            const auto own = hardware_test::factsOf(host_, Class::link, name);
            for (const auto& theirs : {hardware_test::toldByIp(link), hardware_test::countedByIp(link),
                                       hardware_test::toldByEthtool(name)}) {
                for (const std::string& one : hardware_test::differences(own, theirs)) {
                    differing.push_back(name + " " + one);
                }
            }
        }
        return differing;
    };
    EXPECT_TRUE(eventually([&] { return all().empty(); })) << testing::PrintToString(all());
    EXPECT_EQ(fact("veth0", "Speed"), "10000");
    EXPECT_EQ(fact("veth0", "Duplex"), "full");
    EXPECT_EQ(fact("veth0", "Carrier"), "true");
    EXPECT_EQ(fact("lo", "LinkKind"), "loopback");
    EXPECT_EQ(fact("lo", "Speed"), "");
    ip("link set veth1 down");
    EXPECT_EQ(fact("veth0", "Carrier"), "false");
    EXPECT_EQ(fact("veth1", "Carrier"), "") << "one that is off has no signal to tell of";
}

TEST_F(Links, MayHaveAnyName) {
    int taken = 0;
    for (const std::string name : {"\x01\x02\x03\x04\x05\x06\x07\x08\x0e\x0f\x10\x1b[2J", "$(touch x)",
                                   "%s%n", "-", "a;b|c", "\"'\\", "123456789012345"}) {
        std::string quoted = name;
        for (std::size_t at = 0; (at = quoted.find('\'', at)) != std::string::npos; at += 4) {
            quoted.replace(at, 1, "'\\''");
        }
        if (ip("link add name '" + quoted + "' type ifb")) {
            ++taken;
            EXPECT_THAT(listed(host_, Class::link), Contains(name));
            EXPECT_EQ(fact(name, "MTU"), "1500") << name;
            EXPECT_NE(fact(name, "LinkKind"), "") << name;
            ip("link del dev '" + quoted + "'");
        }
    }
    EXPECT_GE(taken, 4);
    EXPECT_THAT(listed(host_, Class::link), UnorderedElementsAre("lo"));
}

TEST_F(Links, ThatVanishHaveNoFacts) {
    EXPECT_EQ(told(host_, Class::link, "gone0"), "");
    EXPECT_EQ(told(host_, Class::link, "a name that is too long for a link"), "");
}

/// One change of the links, at random.
std::string change(std::mt19937& random) {
    const auto pick = [&random](std::size_t count) { return random() % count; };
    const std::string one = "l" + std::to_string(pick(6));
    const std::string two = "l" + std::to_string(pick(6));
    switch (pick(8)) {
        case 0:
            return "link add " + one + " type veth peer name " + two;
        case 1:
            return "link add " + one + " type bridge";
        case 2:
            return "link add " + one + " type ifb";
        case 3:
            return "link del " + one;
        case 4:
            return "link set " + one + (pick(2) == 0 ? " up" : " down");
        case 5:
            return "link set " + one + " mtu " + std::to_string(1000 + pick(500));
        case 6:
            return "link set " + one + (pick(2) == 0 ? " nomaster" : " master " + two);
        default:
            return "link set " + one + " down name " + two;
    }
}

TEST_F(Links, TheTreeFollowsAllChanges) {
    hardware::HardwareMI plugin{hardware::Host()};
    ASSERT_EQ(plugin.initialize(1, IC::Number(1U), IC::Number(2U)).getStatus(), 0);
    SCOPED_TRACE("CORVISTA_SEED=" + std::to_string(kSeed));
    std::mt19937 random(kSeed);
    const RecordedHost recorded;
    constexpr int kAtOnce = 50;
    for (unsigned long done = 0; done < kChanges && !HasFailure(); done += kAtOnce) {
        std::string changes;
        for (int count = 0; count < kAtOnce; ++count) {
            changes += change(random) + "\n";
        }
        recorded.file("/changes", changes);
        ip("-force -batch " + recorded.root() + "/changes");
        EXPECT_TRUE(eventually([&] { return ofTree(plugin) == fresh(); }))
            << testing::PrintToString(ofTree(plugin)) << testing::PrintToString(fresh());
    }
    plugin.unload();
}

TEST_F(Links, NewsThatTheKernelDropsAreALookAtEverything) {
    std::mutex guard;
    std::condition_variable changed;
    std::vector<std::string> heard;
    bool busy = true;
    const Watcher::News news = Watcher::kernelNews();
    const int small = 1;
    ASSERT_EQ(setsockopt(news.links, SOL_SOCKET, SO_RCVBUF, &small, sizeof small), 0);
    const auto hear = [&](const std::string& subsystem) {
        std::unique_lock lock(guard);
        heard.push_back(subsystem);
        changed.notify_all();
        changed.wait(lock, [&] { return !busy; });
    };
    const Watcher watcher(
        hear, news, {std::chrono::milliseconds(1), std::chrono::milliseconds(1), std::chrono::hours(1)});
    const auto hears = [&](std::size_t count) {
        std::unique_lock lock(guard);
        return changed.wait_for(lock, std::chrono::seconds(10), [&] { return heard.size() >= count; });
    };
    ip("link add e0 type ifb");
    ASSERT_TRUE(hears(1));
    for (int number = 0; number < 10; ++number) {
        ip("link add d" + std::to_string(number) + " type ifb");
    }
    {
        const std::lock_guard lock(guard);
        busy = false;
        changed.notify_all();
    }
    EXPECT_TRUE(eventually([&] {
        const std::lock_guard lock(guard);
        return std::find(heard.begin(), heard.end(), "") != heard.end();
    }));
}

}  // namespace
