// The teams of a bonding host as cvagent shows them, with the real plug-in.
#include <gmock/gmock.h>

#include "tests/agent/suse_host.h"
#include "tests/network/bonding_files.h"

namespace {

using testing::AllOf;
using testing::ContainsRegex;
using testing::HasSubstr;

HOST_TEST(Team, IsReadByItsName) {
    SuseHost suse(host);
    installBond(host, "bond0", "active-backup");
    host.file("/proc/net/bonding/bond0~", "");
    const Finished run = suse.run({"get", "team:bond0"});
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(run.out,
                AllOf(ContainsRegex("165 .*MemberPorts.*eth0.*eth1"), ContainsRegex("197 .*TeamName.*bond0"),
                      ContainsRegex("198 .*TeamMode.*fault-tolerance \\(active-backup\\)")));
}

HOST_TEST(Team, HangsUnderTheComputer) {
    SuseHost suse(host);
    installBond(host, "bond0", "802.3ad");
    const Finished run = suse.run({"get", "/oshw/root/computer/team:bond0", "198"});
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(run.out, HasSubstr("IEEE 802.3ad Dynamic link aggregation"));
}

HOST_TEST(Team, IsNoneWithoutABondingDriver) {
    SuseHost suse(host);
    EXPECT_THAT(suse.run({"tree"}).out, testing::Not(HasSubstr("team:")));
    EXPECT_NE(suse.run({"get", "team:bond0"}).status, 0);
}

}  // namespace
