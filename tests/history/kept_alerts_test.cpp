// An alert of the real plug-in is in the history once, wherever commands are killed.
#include <gmock/gmock.h>
#include <signal.h>

#include <algorithm>

#include "tests/agent/suse_host.h"
#include "tests/support/waiting.h"

namespace {

using testing::HasSubstr;

constexpr const char* kState = "/opt/vantrel/corvista/data/oshwminetind.dat";

bool isTakenForTold(const FakeHost& host) {
    return host.read(kState).value_or("").find("eth0=1\n") != std::string::npos;
}

/// The link of eth0 has come up while no agent ran; each command is killed a little later than the one
/// before.
HOST_TEST(KeptAlerts, AreThereOnceHoweverManyCommandsAreKilled) {
    SuseHost suse(host);
    host.toolInTurn("hostname -s", {{.out = "linux\n"}, {.out = "linux\n", .delayMilliseconds = 700}});
    host.file(kState, "eth0=12\n");
    for (int delay = 0; delay < 60 && !isTakenForTold(host); delay += 3) {
        RunningProgram get = host.start(suse.commandLine({"get", "ip-config:eth0", "HostName"}));
        std::this_thread::sleep_for(std::chrono::milliseconds(delay));
        get.signal(SIGKILL);
        get.wait();
    }
    for (int runs = 0; runs < 10 && !isTakenForTold(host); ++runs) {
        suse.run({"get", "ip-config:eth0", "HostName"});
    }
    ASSERT_TRUE(isTakenForTold(host));
    const std::string out = suse.run({"history", "--kind", "alert"}).out;
    EXPECT_THAT(out, HasSubstr("NIC is Online"));
    EXPECT_EQ(std::ranges::count(out, '\n'), 1) << out;
}

}  // namespace
