// What users see of names that are no names: cvagent and the real plug-in on a host where somebody has made
// some.
#include <gmock/gmock.h>

#include "tests/agent/suse_host.h"

namespace {

using testing::HasSubstr;
using testing::Not;

std::size_t occurrences(const std::string& text, const std::string& part) {
    std::size_t count = 0;
    for (auto at = text.find(part); at != text.npos; at = text.find(part, at + 1)) {
        ++count;
    }
    return count;
}

/// A port, a team and a host name with something to run in them, and a tool that tells when it does.
void addNames(FakeHost& host) {
    host.tool("P", ToolAnswer{.out = "", .action = "echo >/marker"});
    host.expectUnrecorded();
    host.file("/proc/net/dev", "Inter-|   Receive\n face |bytes\n  eth0:       1 0 0 0\neth$(P): 1 0 0 0\n");
    host.file("/proc/net/bonding/bond;P", "Bonding Mode: x\nMII Status: up\n\nSlave Interface: eth`P`\n");
    host.tool("brctl show",
              "bridge name\tbridge id\t\tSTP enabled\tinterfaces\nbr\"`P`\t8000.1\tno\t\teth&P\n");
    host.file("/sys/class/net/eth$(P)/address", "02:00:00:aa:bb:02\n");
}

HOST_TEST(RefusedNames, AreToldOnceEachWithWhatToDo) {
    SuseHost suse(host);
    addNames(host);
    const Finished run = suse.run({"tree"});
    EXPECT_EQ(run.status, 0);
    for (const std::string name : {"eth$(P)", "bond;P", "br\\x22`P`"}) {
        EXPECT_EQ(occurrences(run.err, "no command is run with \"" + name + "\""), 1U) << run.err;
    }
    EXPECT_THAT(run.err, HasSubstr("rename the interface, bridge, team, disk or host of that name"));
    EXPECT_THAT(run.err, Not(HasSubstr("Command refused")));
    EXPECT_THAT(host.callsOf("P"), testing::IsEmpty());
    EXPECT_FALSE(host.exists("/marker"));
    EXPECT_THAT(run.out, HasSubstr("network-port:eth0"));
}

HOST_TEST(RefusedNames, AreToldOnceByAWatchToo) {
    SuseHost suse(host);
    addNames(host);
    const Finished run = suse.run({"watch", "--for", "1"});
    EXPECT_EQ(run.status, 0);
    EXPECT_EQ(occurrences(run.err, "no command is run with \"bond;P\""), 1U) << run.err;
    EXPECT_THAT(run.err, Not(HasSubstr("Command refused")));
    EXPECT_FALSE(host.exists("/marker"));
}

HOST_TEST(RefusedNames, AreAllInALogThatIsAskedFor) {
    SuseHost suse(host);
    addNames(host);
    const Finished run = suse.run({"tree", "--log", "/log"});
    EXPECT_EQ(occurrences(run.err, "no command is run with \"bond;P\""), 1U) << run.err;
    EXPECT_GT(
        occurrences(suse.read("/log"), "Command refused for its text \"bond;P\" (the \";\"), not run: "), 1U);
    EXPECT_FALSE(host.exists("/marker"));
}

}  // namespace
