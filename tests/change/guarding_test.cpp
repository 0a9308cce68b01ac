// Which files are saved before a change.
#include "agent/change/guarding.h"

#include <gmock/gmock.h>

#include "tests/support/fake_host.h"

namespace {

using cvagent::change::FileChange;
using cvagent::change::touchedPaths;
using testing::Contains;
using testing::Not;

constexpr const char* kOwner = "/opt/vantrel/corvista/data/asset.dat";

HOST_TEST(Touched, IsAllThatThePluginWritesToWhereThereIsNoPlan) {
    host.directory("/sys/class/net/eth0");
    host.file("/opt/vantrel/corvista/data/ifcfg-eth7", "SAVED=1\n");
    host.file("/opt/vantrel/corvista/data/mimsgsubject.dat", "eth0=1\n");
    const auto paths = touchedPaths({});
    for (const char* each : {kOwner, "/opt/vantrel/corvista/data/ifcfg-eth0",
                             "/opt/vantrel/corvista/data/ifcfg-eth7", "/etc/sysconfig/network/ifcfg-eth0",
                             "/etc/sysconfig/network/ifroute-eth0", "/etc/HOSTNAME", "/etc/resolv.conf"}) {
        EXPECT_THAT(paths, Contains(each));
    }
    EXPECT_THAT(paths, Not(Contains("/opt/vantrel/corvista/data/mimsgsubject.dat")));
}

HOST_TEST(Touched, IsNothingOfTheNetworkForTheComputersOwnSettings) {
    host.directory("/sys/class/net/eth0");
    host.file("/etc/sysconfig/network/ifcfg-eth0", "BOOTPROTO=static\n");
    host.file("/opt/vantrel/corvista/data/ifcfg-eth7", "SAVED=1\n");
    EXPECT_THAT(touchedPaths({}, false),
                testing::UnorderedElementsAre("/etc/localtime", "/etc/localtime.bak", "/etc/timezone",
                                              "/etc/sysconfig/clock", "/etc/sysconfig/clock.bak", kOwner));
}

HOST_TEST(Touched, IsWhatThePlanNames) {
    host.file("/run/resolv.conf", "nameserver 192.0.2.53\n");
    host.symlink("/etc/resolv.conf", "../run/resolv.conf");
    const auto paths =
        touchedPaths({{"/etc/planned", {}, {}}, {"/tmp/__tmp", {}, {}}, {"/opt/x/.lock", {}, {}}});
    EXPECT_THAT(paths, Contains("/etc/planned"));
    EXPECT_THAT(paths, Contains("/run/resolv.conf")) << "what a link leads to";
    for (const char* each : {kOwner, "/tmp/__tmp", "/opt/x/.lock"}) {
        EXPECT_THAT(paths, Not(Contains(each)));
    }
}

}  // namespace
