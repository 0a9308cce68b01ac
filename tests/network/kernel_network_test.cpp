// The queries on links of a real kernel, against what `ip -j` tells of the same links.
#include <gmock/gmock.h>

#include <functional>

#include "network/address_queries.h"
#include "network/interface_lists.h"
#include "network/link_queries.h"
#include "network/route_queries.h"
#include "tests/support/fake_host.h"

namespace {

/// Two ports wired to a bridge (lan0 with everything, lan1 with an on-link route alone), one that is not
/// plugged in.
constexpr const char* kWiring[] = {
    "link add lan0 type veth peer name sw0",
    "link add lan1 type veth peer name sw1",
    "link add lan2 type veth peer name sw2",
    "link add br0 type bridge",
    "link set sw0 master br0",
    "link set sw1 master br0",
    "link set br0 up",
    "link set sw0 up",
    "link set sw1 up",
    "link set lan0 up",
    "link set lan1 up",
    "link set lan2 up",
    "address add 10.1.2.3/20 broadcast + dev lan0",
    "-6 address add 2001:db8:1::3/56 dev lan0 nodad",
    "address add 10.9.0.1/30 dev lan1",
    "-6 address add 2001:db8:2::1/64 dev lan2 nodad",
    "route add default via 10.1.0.1",
    "route add 172.16.0.0/12 via 10.1.0.2 metric 5",
    "-6 route add default via 2001:db8:1::1",
};

class KernelNetwork : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        for (const char* tool : {"ip", "ethtool", "brctl", "busybox"}) {
            host.realTool(tool);
        }
        host.useKernelNetwork();
        for (const char* command : kWiring) {
            const Finished done = host.run({"sh", "-c", std::string("ip ") + command});
            ASSERT_EQ(done.status, 0) << command << ": " << done.err;
        }
    }

    /// Asks with each program that prints the classic formats, whatever this machine's own tools print.
    static void withEachTool(FakeHost& host, const std::function<void()>& questions) {
        for (const std::string& program :
             {std::string("busybox "), buildDirectory() + "/hosttools/corvista-hosttools "}) {
            SCOPED_TRACE("asked with " + program);
            for (const std::string tool : {"ifconfig", "route"}) {
                host.tool(tool + " %any", {.out = "", .action = program + tool + " \"$@\""});
            }
            questions();
        }
    }

    /// The values of a key in what `ip -j` prints, in order.
    static std::vector<std::string> told(FakeHost& host, const std::string& question,
                                         const std::string& key) {
        const std::string json = host.run({"sh", "-c", "ip -j " + question}).out;
        const std::string label = '"' + key + "\":";
        std::vector<std::string> values;
        for (auto at = json.find(label); at != json.npos; at = json.find(label, at + 1)) {
            const auto start = json.find_first_not_of('"', at + label.size());
            values.push_back(json.substr(start, json.find_first_of("\",}", start) - start));
        }
        return values;
    }
    static std::string toldOnce(FakeHost& host, const std::string& question, const std::string& key) {
        const auto values = told(host, question, key);
        return values.empty() ? "" : values.front();
    }
};

std::string dotted(unsigned int prefixLength) {
    const unsigned long bits = prefixLength == 0 ? 0 : 0xFFFFFFFFUL << (32 - prefixLength) & 0xFFFFFFFFUL;
    return std::to_string(bits >> 24) + "." + std::to_string(bits >> 16 & 255) + "." +
           std::to_string(bits >> 8 & 255) + "." + std::to_string(bits & 255);
}

HOST_TEST_F(KernelNetwork, HardwareAddresses) {
    withEachTool(host, [&host] {
        for (const std::string name : {"lan0", "lan1", "lan2", "sw0", "br0"}) {
            std::string address;
            IC::getHardwareAddress(name, address);
            EXPECT_EQ(address, toldOnce(host, "link show " + name, "address")) << name;
            EXPECT_EQ(address.size(), 17U) << name;
        }
    });
}

HOST_TEST_F(KernelNetwork, IPv4Addresses) {
    withEachTool(host, [&host] {
        for (const std::string name : {"lan0", "lan1"}) {
            std::string address;
            std::string mask;
            EXPECT_TRUE(IC::getIPv4Details(name, address, mask)) << name;
            EXPECT_EQ(address, toldOnce(host, "-4 address show dev " + name, "local"));
            EXPECT_EQ(mask, dotted(static_cast<unsigned int>(
                                std::stoul(toldOnce(host, "-4 address show dev " + name, "prefixlen")))));
        }
        std::string none;
        EXPECT_FALSE(IC::getIPv4Details("lan2", none, none));
    });
}

HOST_TEST_F(KernelNetwork, IPv6Addresses) {
    for (const std::string name : {"lan0", "lan2"}) {
        std::string address;
        unsigned int prefixLength = 0;
        EXPECT_TRUE(IC::getIPv6Address(name, address, prefixLength)) << name;
        EXPECT_EQ(address, toldOnce(host, "-6 address show scope global dev " + name, "local"));
        EXPECT_EQ(std::to_string(prefixLength),
                  toldOnce(host, "-6 address show scope global dev " + name, "prefixlen"));
    }
    std::string none = "before";
    unsigned int prefixLength = 7;
    EXPECT_FALSE(IC::getIPv6Address("lan1", none, prefixLength));
    EXPECT_EQ(none, "");
}

HOST_TEST_F(KernelNetwork, ProtocolsAndKinds) {
    withEachTool(host, [] {
        struct Expected {
            const char* name;
            unsigned int code;
            unsigned int kind;
        };
        for (const auto& [name, code, kind] :
             {Expected{"lan0", 4098, 7}, {"lan1", 4096, 2}, {"lan2", 4097, 5}}) {
            unsigned int answer = 0;
            EXPECT_TRUE(IC::getProtocolIIFType(name, answer));
            EXPECT_EQ(answer, code) << name;
            EXPECT_TRUE(IC::getIPv6AddressType(name, answer));
            EXPECT_EQ(answer, kind) << name;
        }
    });
}

HOST_TEST_F(KernelNetwork, Gateways) {
    withEachTool(host, [&host] {
        const std::string gateway = toldOnce(host, "-4 route show default", "gateway");
        const std::string gateway6 = toldOnce(host, "-6 route show default", "gateway");
        std::string answer;
        EXPECT_TRUE(IC::getIPV4Gateway("lan0", answer));
        EXPECT_EQ(answer, gateway);
        EXPECT_TRUE(IC::getIPV4Gateway("lan1", answer)) << "on-link routes alone: the host's default";
        EXPECT_EQ(answer, gateway);
        EXPECT_TRUE(IC::getIPV6Gateway("lan0", answer));
        EXPECT_EQ(answer, gateway6);
        EXPECT_FALSE(IC::getIPV6Gateway("lan2", answer));
        EXPECT_FALSE(IC::getIPV4Gateway("lan2", answer));
    });
}

HOST_TEST_F(KernelNetwork, Links) {
    withEachTool(host, [&host] {
        for (const std::string name : {"lan0", "lan1", "lan2", "sw0"}) {
            const std::string state = toldOnce(host, "link show " + name, "operstate");
            EXPECT_EQ(IC::isNICUp(name), state == "UP") << name << " is " << state;
            EXPECT_TRUE(IC::isInterfaceUP(name)) << name;
            unsigned long long speed = 0;
            EXPECT_TRUE(IC::getNetworkSpeed(name, speed));
            EXPECT_EQ(speed, 10'000'000U) << "what the kernel says of every veth";
            EXPECT_TRUE(IC::getNetworkDuplex(name));
        }
        EXPECT_TRUE(IC::isNICUp("lan0"));
        EXPECT_FALSE(IC::isNICUp("lan2")) << "its other end is down";
        EXPECT_FALSE(IC::isInterfaceUP("sw2"));
        EXPECT_FALSE(IC::isNICUp("lan7"));
    });
}

HOST_TEST_F(KernelNetwork, BridgeMembers) {
    std::vector<std::string> members;
    EXPECT_TRUE(IC::getbridgeInterfaces(members));
    EXPECT_THAT(members, testing::UnorderedElementsAreArray(told(host, "link show master br0", "ifname")));
    EXPECT_EQ(members.size(), 2U);
}

}  // namespace
