// What a system that keeps interfaces is told when its files come back.
#include "agent/undo/keeper_calls.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <net/if.h>
#include <sys/stat.h>
#include <unistd.h>

#include <csignal>
#include <fstream>
#include <thread>

#include "agent/undo/making.h"
#include "agent/undo/networkd_links.h"
#include "agent/undo/taking_back.h"
#include "tests/support/fake_host.h"
#include "tests/undo/killed_at.h"

namespace {

using cvagent::undo::ChangeDirectory;
using cvagent::undo::ChangeInMaking;
using cvagent::undo::Journal;
using cvagent::undo::kChangesPlace;
using cvagent::undo::KeeperCalls;
using cvagent::undo::MakingSettings;
using cvagent::undo::NetworkdLinks;
using cvagent::undo::runCalls;
using cvagent::undo::savedStateFrom;
using cvagent::undo::Stage;
using cvagent::undo::takeBackAfterStart;
using cvagent::undo::takeChangeBack;
using testing::ElementsAre;
using testing::IsEmpty;

constexpr const char* kStanzas = "/etc/network/interfaces";

class KeeperIsTold : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        host.directory(kChangesPlace, 0700);
        host.file(kStanzas, "old\n");
        host.file("/etc/other", "old\n");
        host.tool("/usr/sbin/ifdown eth0",
                  {"", 0, "", 0, "read text < /etc/network/interfaces; [ $text = new ]"});
        host.tool("/usr/sbin/ifup eth0",
                  {"", 0, "", 0, "read text < /etc/network/interfaces; [ $text = old ]"});
        host.tool("/usr/sbin/netplan generate", "");
    }
    static MakingSettings settings() {
        MakingSettings settings;
        settings.paths = {kStanzas, "/etc/other"};
        settings.calls = {{kStanzas}, {"ifdown eth0"}, {"ifup eth0", "netplan generate"}};
        settings.steps = 1;
        settings.window = 600'000;
        return settings;
    }
    static ChangeDirectory made(FakeHost& host, const std::string& file) {
        ChangeInMaking making(settings());
        making.beginStep();
        host.file(file, "new\n");
        making.end();
        return {kChangesPlace, making.number()};
    }
};

HOST_TEST_F(KeeperIsTold, BeforeAndAfterItsFileIsBack) {
    EXPECT_THAT(takeChangeBack(made(host, kStanzas)).notes, IsEmpty());
    EXPECT_EQ(host.read(kStanzas), "old\n");
    EXPECT_THAT(host.calls(),
                ElementsAre("/usr/sbin/ifdown eth0", "/usr/sbin/ifup eth0", "/usr/sbin/netplan generate"));
}

/// He has made a file of his own since, as of name servers, and makes it anew behind his answer.
HOST_TEST_F(KeeperIsTold, AndItsOtherFileIsNoneOfSomebodyElse) {
    host.realTool("sleep");
    host.tool("/usr/sbin/ifdown eth0", "");
    host.tool("/usr/sbin/ifup eth0", {"", 0, "", 0, "(sleep 0.3; echo old >/etc/other) >/dev/null 2>&1 &"});
    ChangeInMaking making(settings());
    making.beginStep();
    host.file(kStanzas, "new\n");
    host.file("/etc/other", "new\n");
    making.end();
    host.file("/etc/other", "new, and the lease's\n");
    EXPECT_THAT(takeChangeBack({kChangesPlace, making.number()}).notes, IsEmpty());
    EXPECT_EQ(host.read("/etc/other"), "old\n");
}

HOST_TEST_F(KeeperIsTold, NothingWhereItsFileHasNotChanged) {
    takeChangeBack(made(host, "/etc/other"));
    EXPECT_EQ(host.read("/etc/other"), "old\n");
    EXPECT_THAT(host.calls(), IsEmpty());
}

/// Somebody may have been killed between the file and the call.
HOST_TEST_F(KeeperIsTold, AgainWhenTheChangeDidNotComeToItsEnd) {
    host.tool("/usr/sbin/ifdown eth0", "");
    ChangeInMaking making(settings());
    making.beginStep();
    making.takeBack();
    EXPECT_THAT(host.callsOf("/usr/sbin/ifup"), ElementsAre("/usr/sbin/ifup eth0"));
}

/// The files come back at once when the time is over in the middle of a step, and its end finds them so.
HOST_TEST_F(KeeperIsTold, WhenTheStepOutlivesTheTimeOfTheChange) {
    host.tool("/usr/sbin/ifdown eth0", "");
    ChangeInMaking making(settings());
    making.beginStep();
    making.directory().update([](Journal& journal) {
        journal.stage = Stage::takingBack;
        return true;
    });
    EXPECT_EQ(making.end().stage, Stage::takingBack);
    takeChangeBack(making.directory());
    EXPECT_THAT(host.callsOf("/usr/sbin/ifup"), ElementsAre("/usr/sbin/ifup eth0"));
}

/// Nothing runs yet that could be told; what netplan makes was made of the files that the change has left.
HOST_TEST_F(KeeperIsTold, WhileTheHostStartsOnlyWhatMakesFiles) {
    made(host, kStanzas).update([](Journal& journal) {
        journal.boot = "another";
        return true;
    });
    bool isWhole = true;
    EXPECT_THAT(takeBackAfterStart(kChangesPlace, isWhole), ElementsAre("change 1: is taken back"));
    EXPECT_TRUE(isWhole);
    EXPECT_EQ(host.read(kStanzas), "old\n");
    EXPECT_THAT(host.calls(), ElementsAre("/usr/sbin/netplan generate"));
}

HOST_TEST_F(KeeperIsTold, AndWhatFailsIsNoted) {
    host.tool("/usr/sbin/ifup eth0", "", 1);
    EXPECT_THAT(takeChangeBack(made(host, kStanzas)).notes, ElementsAre("'ifup eth0' has failed"));
    EXPECT_EQ(host.read(kStanzas), "old\n");
}

HOST_TEST_F(KeeperIsTold, ByNothingButWhatIsKnown) {
    host.tool("/usr/sbin/reboot %any", "");
    for (const char* each :
         {"reboot", "ifup", "ifup ", "ifup -a", "ifup eth0 eth1", "ifup $(reboot)", "ifupx eth0",
          "netplan generate now", "", "/usr/sbin/ifup eth0", "systemctl restart systemd-resolved",
          "systemctl reset-failed", "resolvconf -u x"}) {
        std::vector<std::string> notes;
        runCalls({each}, notes);
        EXPECT_THAT(notes, ElementsAre("'" + std::string(each) + "' is not a command of this program's"));
    }
    std::vector<std::string> notes;
    runCalls({"wicked ifreload eth0"}, notes);
    EXPECT_THAT(notes, ElementsAre("'wicked ifreload eth0' is not installed"));
    EXPECT_THAT(host.calls(), IsEmpty());
}

/// @return whether the kernel takes that for this process when memory is short
bool spare(const char* score) {
    return static_cast<bool>(std::ofstream("/proc/self/oom_score_adj") << score << std::flush);
}

/// A DHCP client that ignores signals and holds the locks of this process would be there for ever.
HOST_TEST_F(KeeperIsTold, ByWhatGetsNothingOfThisProcess) {
    static_cast<void>(signal(SIGTERM, SIG_IGN));
    umask(077);
    const bool isSpared = spare("500") && spare("0") && spare("500");  // not where that is for root alone
    host.tool("/usr/sbin/ifup eth0",
              {"", 0, "", 0,
               "grep SigIgn /proc/self/status > /etc/seen; ls /proc/self/fd > /etc/open;"
               "cat /proc/self/oom_score_adj > /etc/score; cut -d' ' -f6 /proc/self/stat > /etc/session"});
    const int handed = open("/etc/other", O_RDONLY);  // NOLINT: not closed on exec, that is the test
    ASSERT_GE(dup2(handed, 77), 0);
    std::vector<std::string> notes;
    runCalls({"ifup eth0"}, notes);
    EXPECT_THAT(notes, IsEmpty());
    EXPECT_EQ(host.read("/etc/seen"), "SigIgn:\t0000000000000000\n");
    EXPECT_THAT(host.read("/etc/open").value_or(""), testing::Not(testing::HasSubstr("77")));
    EXPECT_TRUE(!isSpared || host.read("/etc/score") == "0\n");
    EXPECT_NE(host.read("/etc/session"), std::to_string(getsid(0)) + "\n");
    struct stat found {};
    ASSERT_EQ(stat("/etc/seen", &found), 0);
    EXPECT_EQ(found.st_mode & 0777U, 0644U);
}

/// It sets links up after it has answered; what has been put back by then would be lost.
HOST_TEST_F(KeeperIsTold, AndWhatItDoesThenIsWaitedFor) {
    host.file("/run/systemd/netif/links/2", "ADMIN_STATE=configuring\n");  // one that waits for a lease
    host.file("/run/systemd/netif/links/3", "ADMIN_STATE=configured\n");
    for (const char* tool : {"sleep", "mv"}) {
        host.realTool(tool);
    }
    host.tool(
        "/usr/bin/networkctl reload",
        {"", 0, "", 0,
         "PATH=/tools:/usr/bin:/bin\n"
         "say() { sleep 0.2; echo ADMIN_STATE=$1 > /run/new; mv /run/new /run/systemd/netif/links/3; }\n"
         "(say initialized; say configuring; echo > /set-up; say configured) >/dev/null 2>&1 &"});
    std::vector<std::string> notes;
    runCalls({"networkctl reload"}, notes);
    EXPECT_THAT(notes, IsEmpty());
    EXPECT_TRUE(host.exists("/set-up"));
    EXPECT_EQ(host.read("/run/systemd/netif/links/3"), "ADMIN_STATE=configured\n");
}

/// What systemd-networkd has noted of two links; the first waits for a lease, for ever.
class NetworkdSetsUp : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        host.realTool("ip");
        host.useKernelNetwork();
        ASSERT_EQ(host.run({"ip", "link", "set", "lo", "up"}).status, 0);
        says(host, "ADMIN_STATE=configured\n");
        host.file(kLinks + std::string("2222"), "ADMIN_STATE=configuring\nNETWORK_FILE=/etc/dhcp.network\n");
        host.file("/etc/dhcp.network", "[Network]\nDHCP=yes\n");
    }
    static void says(FakeHost& host, const std::string& text) {
        host.remove(kLinks + index());
        host.file(kLinks + index(), text);
    }
    static std::string index() { return std::to_string(if_nametoindex("lo")); }
    static constexpr const char* kLinks = "/run/systemd/netif/links/";
};

/// Without a carrier it is never ready, and without a router's word it does not say that it is.
HOST_TEST_F(NetworkdSetsUp, WhatItCan) {
    const std::string atWork = "ADMIN_STATE=configuring\nNETWORK_FILE=/etc/lo.network\n";
    ASSERT_EQ(host.run({"ip", "address", "add", "192.0.2.10/24", "dev", "lo"}).status, 0);
    ASSERT_EQ(host.run({"ip", "route", "add", "default", "via", "192.0.2.1", "dev", "lo"}).status, 0);
    host.file("/etc/lo.network",
              "[Match]\nName=lo\n[Network]\nAddress=\nAddress = 192.0.2.10/24 \nAddress=0.0.0.0/24\n"
              "Gateway=192.0.2.1\nGateway=_ipv6ra\n");
    for (const std::string& text :
         {std::string("ADMIN_STATE=configured\n"), "OPER_STATE=no-carrier\n" + atWork, atWork}) {
        const NetworkdLinks before;
        says(host, text);
        EXPECT_TRUE(before.waitUntilSetUp()) << text;
    }
    says(host, "OPER_STATE=no-carrier\n" + atWork);
    EXPECT_TRUE(NetworkdLinks(if_nametoindex("lo")).waitUntilSetUp());
    host.remove("/run/systemd");
    EXPECT_TRUE(NetworkdLinks().waitUntilSetUp());
}

HOST_TEST_F(NetworkdSetsUp, NothingThatIsNotInTheKernelYet) {
    const std::jthread clock([](const std::stop_token& over) {
        while (!over.stop_requested()) {
            passTime(std::chrono::seconds(1));
            usleep(1000);
        }
    });
    for (const char* file :
         {"Address=192.0.2.10/24\n", "Address=127.0.0.1/24\n", "Gateway=192.0.2.1\n", "DHCP=ipv4\n", ""}) {
        host.file("/etc/lo.network", file);
        const NetworkdLinks before;
        says(host, "ADMIN_STATE=configuring\nNETWORK_FILE=/etc/lo.network\n");
        EXPECT_FALSE(before.waitUntilSetUp()) << file;
    }
}

HOST_TEST_F(KeeperIsTold, AsWasSaved) {
    cvagent::undo::SavedState state;
    state.calls = settings().calls;
    const KeeperCalls back = savedStateFrom(textOf(state)).calls;
    EXPECT_EQ(back.files, state.calls.files);
    EXPECT_EQ(back.before, state.calls.before);
    EXPECT_EQ(back.after, state.calls.after);
}

}  // namespace
