// What NetworkManager says of a link on the bus.
#include <gmock/gmock.h>
#include <sys/socket.h>
#include <sys/un.h>

#include <chrono>

#include "agent/keep/daemons.h"
#include "agent/keep/systems.h"
#include "agent/service/private_bus.h"
#include "hosttools/descriptor.h"
#include "tests/keep/mock_manager.h"
#include "tests/support/fake_host.h"

namespace {

using cvagent::keep::Daemons;
using cvagent::keep::Keeper;
using cvagent::keep::keeperOf;
using testing::ElementsAre;
using testing::IsEmpty;
using Clock = std::chrono::steady_clock;

constexpr const char* kDevice = "/org/freedesktop/NetworkManager/Devices/2";
constexpr const char* kActive = "/org/freedesktop/NetworkManager/ActiveConnection/1";
constexpr const char* kProfile = "/org/freedesktop/NetworkManager/Settings/1";

MockManager::Objects managed(const std::string& file, std::uint32_t flags = 0x4c) {
    return {{std::string(kDevice) + " Managed", true},
            {std::string(kDevice) + " ActiveConnection", MockManager::Path{kActive}},
            {std::string(kActive) + " StateFlags", flags},
            {std::string(kActive) + " Id", std::string("Wired connection 1")},
            {std::string(kActive) + " Connection", MockManager::Path{kProfile}},
            {std::string(kProfile) + " Filename", file}};
}

class ManagerOnBus : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        host.realTool("dbus-daemon");
        host.file("/etc/passwd", "root:x:0:0::/root:/bin/sh\n");
        bus_ = std::make_unique<cvagent::service::PrivateBus>("/run/own");
    }
    void tearDownHost(FakeHost& /*host*/) override { bus_.reset(); }

    const std::string& address() const { return bus_->address(); }
    Keeper eth0() const { return of("eth0"); }
    Keeper of(const std::string& link) const {
        Daemons daemons(address());
        return keeperOf({link, 3}, daemons);
    }

private:
    std::unique_ptr<cvagent::service::PrivateBus> bus_;
};

HOST_TEST_F(ManagerOnBus, KeepsWhatItManages) {
    const MockManager manager(address(), {{"eth0", kDevice}},
                              managed("/etc/NetworkManager/system-connections/w.nmconnection"));
    ASSERT_EQ(eth0().claims.size(), 1U);
    EXPECT_EQ(eth0().system(), "NetworkManager");
    EXPECT_EQ(eth0().claims[0].evidence,
              "NetworkManager manages it, with the connection 'Wired connection 1'");
    EXPECT_EQ(eth0().claims[0].source, "/etc/NetworkManager/system-connections/w.nmconnection");
    EXPECT_THAT(of("eth1").claims, IsEmpty());
    EXPECT_THAT(of("eth1").unknown, IsEmpty());
    EXPECT_THAT(of("\xff").claims, IsEmpty());  // no text to the bus
}

HOST_TEST_F(ManagerOnBus, KeepsNothingThatItOnlyShows) {
    const MockManager manager(address(), {{"eth0", kDevice}}, managed("/run/NetworkManager/x", 0x80));
    EXPECT_THAT(eth0().claims, IsEmpty());
}

HOST_TEST_F(ManagerOnBus, KeepsNothingThatItDoesNotManage) {
    auto objects = managed("");
    objects[std::string(kDevice) + " Managed"] = false;
    const MockManager manager(address(), {{"eth0", kDevice}}, objects);
    EXPECT_THAT(eth0().claims, IsEmpty());
    EXPECT_THAT(eth0().unknown, IsEmpty());
}

HOST_TEST_F(ManagerOnBus, ManagesLinksThatAreNotConnected) {
    auto objects = managed("");
    objects[std::string(kDevice) + " ActiveConnection"] = MockManager::Path{"/"};
    const MockManager manager(address(), {{"eth0", kDevice}}, objects);
    ASSERT_EQ(eth0().claims.size(), 1U);
    EXPECT_EQ(eth0().claims[0].evidence, "NetworkManager manages it, with no connection active");
}

HOST_TEST_F(ManagerOnBus, WorksForNetplan) {
    const MockManager manager(address(), {{"eth0", kDevice}},
                              managed("/run/NetworkManager/system-connections/netplan-eth0.nmconnection"));
    EXPECT_EQ(eth0().system(), "netplan");
}

/// Versions of old tell no file, and what is not saved has none.
HOST_TEST_F(ManagerOnBus, MayTellNoFile) {
    auto objects = managed("");
    objects.erase(std::string(kProfile) + " Filename");
    const MockManager manager(address(), {{"eth0", kDevice}}, objects);
    EXPECT_EQ(eth0().system(), "NetworkManager");
}

HOST_TEST_F(ManagerOnBus, IsNotBelievedWithValuesOfAnotherType) {
    auto objects = managed("");
    objects[std::string(kDevice) + " Managed"] = std::string("yes");
    const MockManager manager(address(), {{"eth0", kDevice}}, objects);
    EXPECT_THAT(eth0().claims, IsEmpty());
    EXPECT_EQ(eth0().unknown.size(), 1U);
    EXPECT_EQ(eth0().system(), "");
}

/// All links together, not each.
HOST_TEST_F(ManagerOnBus, IsWaitedForOnceWhenItHangs) {
    const MockManager manager(address(), {}, {}, true);
    Daemons daemons(address());
    const auto start = Clock::now();
    for (unsigned link = 1; link <= 50; ++link) {
        EXPECT_THAT(keeperOf({"eth" + std::to_string(link), link}, daemons).unknown,
                    ElementsAre("org.freedesktop.NetworkManager has not answered for 2 s"));
    }
    EXPECT_GE(Clock::now() - start, std::chrono::seconds(2));
    EXPECT_LT(Clock::now() - start, std::chrono::seconds(40));
}

HOST_TEST(Daemons, AreNotWaitedForOnABusThatDoesNotGreet) {
    host.directory("/run/own");
    const hosttools::Descriptor silent(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
    sockaddr_un place{AF_UNIX, "/run/own/bus"};
    ASSERT_EQ(bind(silent.get(), reinterpret_cast<const sockaddr*>(&place), sizeof place), 0);
    ASSERT_EQ(listen(silent.get(), 8), 0);
    Daemons daemons("unix:path=/run/own/bus");
    const auto start = Clock::now();
    for (unsigned link = 1; link <= 50; ++link) {
        EXPECT_THAT(keeperOf({"eth0", link}, daemons).unknown,
                    ElementsAre("the system's bus has not answered for 2 s"));
    }
    EXPECT_LT(Clock::now() - start, std::chrono::seconds(40));
}

}  // namespace
