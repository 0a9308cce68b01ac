#include "network/lan_endpoint_node.h"

#include <arpa/inet.h>
#include <dlfcn.h>
#include <gmock/gmock.h>
#include <ifaddrs.h>
#include <netinet/in.h>

#include <cerrno>
#include <cstring>
#include <deque>

#include "tests/network/port_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/texts_are.h"

namespace {

using testing::Contains;

/// While it lives, the kernel has these addresses; without any it does not answer.
class Addresses {
public:
    Addresses() { now = this; }
    Addresses(const Addresses&) = delete;
    Addresses& operator=(const Addresses&) = delete;
    ~Addresses() { now = nullptr; }

    Addresses& add(const std::string& interface, const char* address, const char* mask) {
        Entry& entry = entries_.emplace_back();
        entry.name = interface;
        entry.link.ifa_name = entry.name.data();
        entry.link.ifa_addr = set(entry.address, address);
        entry.link.ifa_netmask = set(entry.mask, mask);
        if (entries_.size() > 1) {
            entries_[entries_.size() - 2].link.ifa_next = &entry.link;
        }
        return *this;
    }
    ifaddrs* first() { return entries_.empty() ? nullptr : &entries_.front().link; }

    static Addresses* now;

private:
    struct Entry {
        std::string name;
        sockaddr_storage address{};
        sockaddr_storage mask{};
        ifaddrs link{};
    };

    static sockaddr* set(sockaddr_storage& out, const char* text) {
        if (std::strchr(text, ':') != nullptr) {
            sockaddr_in6 address{};
            address.sin6_family = AF_INET6;
            EXPECT_EQ(inet_pton(AF_INET6, text, &address.sin6_addr), 1) << text;
            std::memcpy(&out, &address, sizeof(address));
        } else {
            sockaddr_in address{};
            address.sin_family = AF_INET;
            EXPECT_EQ(inet_pton(AF_INET, text, &address.sin_addr), 1) << text;
            std::memcpy(&out, &address, sizeof(address));
        }
        return reinterpret_cast<sockaddr*>(&out);
    }

    std::deque<Entry> entries_;
};
Addresses* Addresses::now = nullptr;

template <class Function>
Function* next(const char* name) {
    return reinterpret_cast<Function*>(dlsym(RTLD_NEXT, name));
}

}  // namespace

// Both stand in front of the C library's for the code in this program.
extern "C" __attribute__((visibility("default"))) int getifaddrs(ifaddrs** out) noexcept {
    if (Addresses::now == nullptr) {
        return next<int(ifaddrs**)>("getifaddrs")(out);
    }
    *out = Addresses::now->first();
    if (*out == nullptr) {
        errno = ENOMEM;
        return -1;
    }
    return 0;
}

extern "C" __attribute__((visibility("default"))) void freeifaddrs(ifaddrs* list) noexcept {
    if (Addresses::now == nullptr) {
        next<void(ifaddrs*)>("freeifaddrs")(list);
    }
}

namespace {

HOST_TEST(LanEndPoint, IsBuiltForEachInterfaceWithAddresses) {
    PortHost plugin(host, "no-network-tools");
    host.useKernelNetwork();
    LogCapture capture;
    plugin.mi().createLANEndPointNodes();
    const auto endPoint = plugin.node(73, "lo");
    ASSERT_NE(endPoint, nullptr);
    EXPECT_EQ(endPoint->getDescription(), "LAN EndPoint node");
    EXPECT_EQ(endPoint->getStatus(), 1U);
    EXPECT_EQ(endPoint->getLinkedId(), plugin.controller());
    const auto config = plugin.config("lo");
    ASSERT_NE(config, nullptr);
    EXPECT_EQ(config->getLinkedId(), endPoint->getNodeId());
    EXPECT_EQ(PortHost::stored(*config, 25), text("127.0.0.1"));
    EXPECT_EQ(PortHost::stored(*config, 26), text("255.0.0.0"));
    EXPECT_EQ(capture.ownMessages().front(), "In OsHwMI::createLANEndPointNodes");
    EXPECT_EQ(capture.ownMessages().back(), "Exit OsHwMI::createLANEndPointNodes");
    EXPECT_THAT(capture.ownMessages(), Contains("OsHwMI::createLANEndPointNodes, Size is: 1"));
}

HOST_TEST(LanEndPoint, IsNotBuiltWhenTheKernelDoesNotAnswer) {
    PortHost plugin(host, "no-network-tools");
    const Addresses none;
    LogCapture capture;
    plugin.mi().createLANEndPointNodes();
    EXPECT_THAT(capture.ownMessages(6000),
                TextsAre("OsHwMI::createLANEndPointNodes, not able to get IPInfo"));
    EXPECT_THAT(plugin.names(73), testing::IsEmpty());
}

HOST_TEST(LanEndPoint, HasAConfigurationForEachAddress) {
    PortHost plugin(host, "no-network-tools");
    Addresses addresses;
    addresses.add("eth0", "192.0.2.10", "255.255.255.0").add("eth0", "2001:db8::10", "ffff:ffff:ffff::");
    plugin.mi().createLANEndPointNodes();
    const auto endPoint = plugin.node(73, "eth0");
    ASSERT_NE(endPoint, nullptr);
    EXPECT_EQ(endPoint->getIndex(), 1U);
    std::vector<std::shared_ptr<IC::MutableNode>> configs = plugin.mi().holdAll();
    std::erase_if(configs, [](const auto& node) { return node->nodeType() != 29; });
    ASSERT_EQ(configs.size(), 2U);
    for (const auto& config : configs) {
        EXPECT_EQ(config->getLinkedId(), endPoint->getNodeId());
    }
    EXPECT_EQ(configs[0]->getIndex(), 1U);
    EXPECT_EQ(PortHost::stored(*configs[0], 25), text("192.0.2.10"));
    EXPECT_EQ(PortHost::stored(*configs[0], 26), text("255.255.255.0"));
    EXPECT_EQ(configs[1]->getIndex(), 2U);
    EXPECT_EQ(PortHost::stored(*configs[1], 27), text("2001:db8::10"));
    EXPECT_EQ(PortHost::stored(*configs[1], 102), number(48));
}

HOST_TEST(LanEndPoint, IsBuiltOnceMoreUnderThePortItsNameCarries) {
    PortHost plugin(host, "no-network-tools");
    CEthernetPort port{"eth0", "", "", 4711};
    std::map<std::string, CEthernetPort*> ports = {{"eth0", &port}};
    IC::m_mapEthernetPorts = &ports;
    Addresses addresses;
    addresses.add("eth0#1", "192.0.2.10", "255.255.255.0").add("eth1#1", "192.0.2.11", "255.255.255.0");
    LogCapture capture;
    plugin.mi().createLANEndPointNodes();
    IC::m_mapEthernetPorts = nullptr;
    EXPECT_THAT(plugin.names(73), TextsAre("eth0#1", "eth1#1", "eth0#1"));
    EXPECT_EQ(plugin.mi().holdAll().back()->getLinkedId(), 4711U);
    EXPECT_EQ(plugin.mi().holdAll().back()->getIndex(), 3U);
    EXPECT_THAT(capture.ownMessages(), Contains("In getParentLANEndPointNode eth0#1"));
    EXPECT_THAT(capture.ownMessages(), Contains("getParentLANEndPointNode: exit").Times(2));
    EXPECT_THAT(capture.ownMessages(), Contains("OsHwMI::createLANEndPointNodes, Size is: 2"));
}

HOST_TEST(LanEndPoint, PassesEverythingToTheFramework) {
    IC::CLANEndPointNode node(9, 1, {1}, 73, 1, "eth0");
    LogCapture capture;
    EXPECT_EQ(node.setProperty(123, number(12)).getStatus(), 0);
    EXPECT_EQ(PortHost::live(node, 123), number(12));
    EXPECT_THAT(capture.ownMessages(),
                TextsAre("CLANEndPointNode::setProperty: entry", "CLANEndPointNode::setProperty: exit",
                         "CLANEndPointNode::getProperty: entry", "CLANEndPointNode::getProperty: exit"));
}

TEST(LanEndPoint, FindsThePortANameIsDerivedFrom) {
    unsigned int id = 77;
    EXPECT_FALSE(IC::getParentLANEndPointNode("eth0#1", id)) << "nobody keeps port records";
    CEthernetPort port{"eth0", "", "", 12};
    std::map<std::string, CEthernetPort*> ports = {{"eth0", &port}, {"eth0#1", &port}};
    IC::m_mapEthernetPorts = &ports;
    EXPECT_TRUE(IC::getParentLANEndPointNode("eth0#1", id));
    EXPECT_EQ(id, 12U);
    id = 77;
    EXPECT_TRUE(IC::getParentLANEndPointNode("eth0#1#2", id)) << "cut at the last mark";
    EXPECT_FALSE(IC::getParentLANEndPointNode("eth1#1", id = 77));
    EXPECT_EQ(id, 77U);
    IC::m_mapEthernetPorts = nullptr;
}

}  // namespace
