// What has changed while no agent ran is told by whatever runs next, before the plug-in takes it for told.
#include <gmock/gmock.h>
#include <signal.h>

#include "tests/agent/suse_host.h"
#include "tests/support/waiting.h"

namespace {

using testing::HasSubstr;
using testing::Not;

constexpr const char* kState = "/opt/vantrel/corvista/data/oshwminetind.dat";
const std::string kAlert =
    "cvagent: alert: /oshw/root/computer/chassis/network-controller/network-port:eth0: NIC is Online\n";

constexpr const char* kTaken =
    "until read -r link < /opt/vantrel/corvista/data/oshwminetind.dat && [ \"$link\" = eth0=1 ]; do sleep "
    "0.01; done";

/// The link of eth0 has come up while no agent ran, and the host's name is told once the plug-in's first pass
/// has taken that for told, so that the pass ends before the command does.
class LinkThatCameUp : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        suse.emplace(host);
        nameAfter(host, kTaken);
        host.file(kState, "eth0=12\n");
    }
    static void nameAfter(FakeHost& host, const std::string& action) {
        host.toolInTurn("hostname -s", {{.out = "linux\n"}, {.out = "linux\n", .action = action}});
    }
    static bool isTakenForTold(const FakeHost& host) {
        return host.read(kState).value_or("").find("eth0=1\n") != std::string::npos;
    }
    Finished inShell(FakeHost& host, const std::string& words) {
        std::string line;
        for (const std::string& word : suse->commandLine({})) {
            line += word + " ";
        }
        return host.run({"sh", "-c", line + words});
    }

    std::optional<SuseHost> suse;
};

HOST_TEST_F(LinkThatCameUp, IsToldByAReadOnce) {
    const Finished run = suse->run({"get", "ip-config:eth0", "HostName"});
    EXPECT_EQ(run.status, 0);
    EXPECT_TRUE(isTakenForTold(host));
    EXPECT_EQ(run.err, kAlert);
    EXPECT_EQ(suse->run({"get", "ip-config:eth0", "HostName"}).err, "");
}

HOST_TEST_F(LinkThatCameUp, IsToldByAWrite) {
    host.tool("hostname earth.example.com", "");
    EXPECT_THAT(suse->run({"set", "ip-config:eth0", "HostName", "earth"}).err, HasSubstr(kAlert));
    EXPECT_TRUE(isTakenForTold(host));
}

/// A tree may be drawn before the pass is made.
HOST_TEST_F(LinkThatCameUp, IsToldByTheTreeThatTakesItForTold) {
    std::string told;
    for (int runs = 0; runs < 30 && !isTakenForTold(host); ++runs) {
        nameAfter(host, "");
        told = suse->run({"tree"}).err;
    }
    EXPECT_EQ(told, isTakenForTold(host) ? kAlert : "");
}

HOST_TEST_F(LinkThatCameUp, IsToldWhereStandardOutputTakesNothing) {
    const Finished closed = inShell(host, "get ip-config:eth0 HostName >&-");
    EXPECT_EQ(closed.status, 1);
    EXPECT_THAT(closed.err, HasSubstr(kAlert));
    host.file(kState, "eth0=12\n");
    nameAfter(host, kTaken);
    const Finished full = inShell(host, "get ip-config:eth0 HostName > /dev/full");
    EXPECT_EQ(full.status, 1);
    EXPECT_THAT(full.err, HasSubstr(kAlert));
    host.file(kState, "eth0=12\n");
    const Finished watched = inShell(host, "watch > /dev/full");
    EXPECT_EQ(watched.status, 1);
    EXPECT_THAT(watched.err, HasSubstr(kAlert));
    EXPECT_THAT(watched.err, HasSubstr("cannot write to standard output: No space left on device"));
}

HOST_TEST_F(LinkThatCameUp, IsToldByACommandThatIsInterrupted) {
    nameAfter(host, "sleep 60");
    RunningProgram get = host.start(suse->commandLine({"get", "ip-config:eth0", "HostName"}));
    EXPECT_TRUE(eventually([&host] { return isTakenForTold(host); }));
    get.signal(SIGTERM);
    EXPECT_EQ(get.wait().err, kAlert);
}

/// Where nothing is told to anybody, nothing may be taken for told either.
HOST_TEST_F(LinkThatCameUp, IsNotTakenForToldByACommandThatIsKilledAtOnce) {
    std::string told;
    for (int delay = 0; delay < 60; delay += 6) {
        host.file(kState, "eth0=12\n");
        RunningProgram get = host.start(suse->commandLine({"get", "ip-config:eth0", "HostName"}));
        std::this_thread::sleep_for(std::chrono::milliseconds(delay));
        get.signal(SIGKILL);
        const std::string err = get.wait().err;
        EXPECT_TRUE(!isTakenForTold(host) || err == kAlert) << delay << " " << err;
    }
}

}  // namespace
