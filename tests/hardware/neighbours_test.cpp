// What lldpd has heard of a link's neighbours: by a client library that tells it to anybody.
#include <dlfcn.h>
#include <gmock/gmock.h>

#include "tests/hardware/storage_host.h"
#include "tests/support/waiting.h"

namespace {

using hardware::Class;
using hardware::Neighbours;
using hardware_test::factsOf;
using hardware_test::StorageHost;
using testing::Contains;
using testing::IsEmpty;
using testing::Key;
using testing::Not;

/// Loaded by its path, it is found by its name from now on: before any test asks for it.
void* const fakeLibrary = dlopen(CORVISTA_FAKE_LLDPCTL, RTLD_NOW);

TEST(LldpdsLibrary, IsReadWholeAndGivenEverythingBack) {
    ASSERT_NE(fakeLibrary, nullptr) << dlerror();
    const Neighbours all = hardware::ownDevices()->neighbours();
    ASSERT_EQ(all.size(), 1U) << "links without neighbours are left out";
    const std::vector<hardware::Neighbour>& heard = all.at("eth0");
    ASSERT_EQ(heard.size(), 2U);
    EXPECT_EQ(heard[0].name, "switch-1.example");
    EXPECT_EQ(heard[0].chassis, "00:11:22:33:44:55");
    EXPECT_EQ(heard[0].port, "ge-0/0/7");
    EXPECT_EQ(heard[0].portDescription, "to the rack");
    EXPECT_EQ(heard[1].chassis, "a");
    EXPECT_EQ(heard[1].port, "");
    const auto handedOut = reinterpret_cast<int (*)()>(dlsym(fakeLibrary, "fake_lldpctl_handed_out"));
    ASSERT_NE(handedOut, nullptr);
    EXPECT_EQ(handedOut(), 0);
}

TEST(LinkNeighbours, AreThoseOfTheLinkAndPrintable) {
    StorageHost host;
    host.file("/sys/class/net/eth0/mtu", "1500");
    host.file("/sys/class/net/eth1/mtu", "1500");
    host.devices->lldp = [] { return hardware::ownDevices()->neighbours(); };
    auto facts = factsOf(host.asNobody(), Class::link, "eth0");
    EXPECT_EQ(facts["Neighbours"], "switch-1.example | evil?[2J??");
    EXPECT_EQ(facts["NeighbourChassis"], "00:11:22:33:44:55 | a");
    EXPECT_EQ(facts["NeighbourPorts"], "ge-0/0/7 | ");
    EXPECT_EQ(facts["NeighbourPortDescriptions"], "to the rack | ");
    EXPECT_THAT(factsOf(host.asNobody(), Class::link, "eth1"), Not(Contains(Key("Neighbours"))));
}

TEST(LinkNeighbours, AreAskedForOnceForAllLinks) {
    StorageHost host;
    host.devices->lldp = [] { return Neighbours{{"eth0", {{"a", "b", "c", "d"}}}}; };
    const hardware::Host kept = host.asRoot(std::chrono::seconds(20), std::chrono::hours(1));
    for (int link = 0; link < 5; ++link) {
        factsOf(kept, Class::link, "eth" + std::to_string(link));
    }
    EXPECT_EQ(host.devices->asked().size(), 1U);
}

TEST(LinkNeighbours, ALldpdThatHangsCostsNothingElse) {
    StorageHost host;
    host.file("/sys/class/net/eth0/mtu", "1500");
    const auto gate = std::make_shared<hardware_test::Gate>();
    host.devices->lldp = [gate] {
        gate->wait();
        return Neighbours();
    };
    const hardware::Host patient = host.asRoot(std::chrono::milliseconds(20), std::chrono::hours(1));
    hardware::Found found{Class::link, "eth0"};
    sourceOf(Class::link).describe(patient, found);
    EXPECT_TRUE(found.facts.isUnanswered(31024));
    EXPECT_EQ(factsOf(patient, Class::link, "eth0").at("MTU"), "1500");
    ASSERT_TRUE(eventually([&host] { return !host.devices->asked().empty(); }));
    EXPECT_EQ(host.devices->asked().size(), 1U);
    gate->open();
}

TEST(LinkNeighbours, OfARecordedHostAreNotAskedFor) {
    StorageHost host;
    factsOf(host.host(), Class::link, "eth0");
    EXPECT_THAT(host.devices->asked(), IsEmpty());
}

}  // namespace
