// Changes that wait for their confirmation, by running the program on links of a real kernel.
#include <arpa/inet.h>
#include <fcntl.h>
#include <gmock/gmock.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>
#include <nlohmann/json.hpp>

#include "tests/agent/linked_host.h"
#include "tests/agent/terminal.h"
#include "tests/support/waiting.h"
#include "tests/undo/waited_for.h"

namespace {

using testing::HasSubstr;
using testing::Not;
using Json = nlohmann::ordered_json;

constexpr const char* kNewAddress = "203.0.113.7";

class Confirmed : public LinkedHost {
protected:
    void setUpHost(FakeHost& host) override {
        LinkedHost::setUpHost(host);
        old_ = look(host);
    }

    static Finished set(FakeHost& host, const std::string& seconds) {
        return cvagent(host,
                       {"set", "ip-config:eth0", "IPv4Address", kNewAddress, "--confirm-within", seconds});
    }
    std::string look(FakeHost& host) const {
        return ip(host, "-4 address show dev eth0") + ip(host, "-4 route show table main") +
               host.read(file_).value_or("-") + host.run({"stat", "-c", "%a %y", file_}).out +
               host.read("/etc/sysconfig/network/routes").value_or("-");
    }
    bool comesBack(FakeHost& host) const {
        for (int i = 0; i < 6000 && look(host) != old_; ++i) {
            usleep(10'000);
        }
        EXPECT_EQ(look(host), old_);
        return look(host) == old_;
    }
    static std::string stages(FakeHost& host) {
        std::string all;
        std::istringstream lines(cvagent(host, {"history", "--changes", "--json"}).out);
        for (std::string line; std::getline(lines, line);) {
            const Json change = Json::parse(line);
            all += (all.empty() ? "" : ", ") + change["change"].dump() + " " +
                   change["stage"].get<std::string>();
        }
        return all;
    }

    std::string old_;
};

HOST_TEST_F(Confirmed, AChangeThatNobodyConfirmsIsTakenBack) {
    const Finished run = set(host, "600");
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(run.out, HasSubstr("new  203.0.113.7"));
    EXPECT_THAT(run.err,
                HasSubstr("change 1 is taken back in 600 seconds unless somebody types: cvagent confirm 1"));
    EXPECT_EQ(cvagent(host, {"confirm", "1", "--lengthen", "0.1"}).status, 0);
    EXPECT_TRUE(comesBack(host));
    EXPECT_TRUE(eventually([&host] { return stages(host) == "1 is taken back"; })) << stages(host);
    const Finished late = cvagent(host, {"confirm", "1"});
    EXPECT_EQ(late.status, 1);
    EXPECT_THAT(late.err, HasSubstr("change 1 cannot be confirmed: it is taken back"));
}

HOST_TEST_F(Confirmed, AChangeThatIsConfirmedStaysUntilItIsRolledBack) {
    ASSERT_EQ(set(host, "600").status, 0);
    const std::string changed = look(host);
    EXPECT_THAT(changed, HasSubstr("IPADDR=203.0.113.7"));
    EXPECT_EQ(stages(host), "1 waits for its confirmation");
    const Finished second = set(host, "600");
    EXPECT_EQ(second.status, 1);
    EXPECT_THAT(second.err, HasSubstr("the change cannot be guarded: change 1 waits for its confirmation"));
    EXPECT_THAT(cvagent(host, {"confirm", "1", "--lengthen", "300"}).out,
                HasSubstr("change 1 has 300 seconds"));
    EXPECT_EQ(cvagent(host, {"confirm", "1"}).out, "change 1 is kept\n");
    EXPECT_EQ(look(host), changed);
    const Finished back = cvagent(host, {"rollback"});
    EXPECT_EQ(back.status, 0) << back.err;
    EXPECT_EQ(back.out, "change 1 is taken back\n");
    EXPECT_EQ(look(host), old_);
    EXPECT_EQ(cvagent(host, {"rollback"}).status, 3);
}

/// Broken off in its middle it would leave a host that nobody reaches.
HOST_TEST_F(Confirmed, NeitherAKeyNorAHangUpBreaksARollbackOff) {
    ASSERT_EQ(set(host, "600").status, 0);
    ASSERT_EQ(cvagent(host, {"confirm", "1"}).status, 0);
    const std::string lock = "/var/lib/corvista/changes/1/taking.lock";
    int held = open(lock.c_str(), O_RDWR | O_CLOEXEC);
    struct flock whole {};
    whole.l_type = F_WRLCK;
    ASSERT_EQ(fcntl(held, F_OFD_SETLK, &whole), 0);
    const pid_t rollback = fork();
    if (rollback == 0) {
        dup2(open("/dev/null", O_WRONLY), STDOUT_FILENO);
        execl(CVAGENT_PROGRAM, CVAGENT_PROGRAM, "rollback", nullptr);
    }
    for (int i = 0; i < 6000 && !isWaitedFor(host, lock); ++i) {
        usleep(10'000);
    }
    for (const int each : {SIGINT, SIGHUP, SIGTERM, SIGQUIT, SIGTSTP}) {
        kill(rollback, each);
    }
    close(held);
    int status = 0;
    waitpid(rollback, &status, 0);
    EXPECT_EQ(status, 0);
    EXPECT_EQ(look(host), old_);
    EXPECT_EQ(stages(host), "1 is taken back");
}

/// Also what nobody was asked a confirmation for.
HOST_TEST_F(Confirmed, ASetIsRolledBack) {
    const Finished run = cvagent(host, {"set", "ip-config:eth0", "IPv4Address", kNewAddress});
    ASSERT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(look(host), HasSubstr("203.0.113.7/24"));
    EXPECT_THAT(cvagent(host, {"history", "--changes"}).out,
                HasSubstr("is kept                     /oshw/root/computer/chassis/network-controller/"
                          "network-port:eth0/ip-config:eth0 IPv4Address  (by uid 0)\n"));
    ASSERT_EQ(cvagent(host, {"set", "computer", "OwnerName", "x"}).status, 0);
    EXPECT_EQ(stages(host), "1 is kept, 2 is kept");
    EXPECT_THAT(cvagent(host, {"rollback", "1"}).err, HasSubstr("change 2 stands on it"));
    EXPECT_EQ(cvagent(host, {"rollback"}).out, "change 2 is taken back\n");
    EXPECT_THAT(cvagent(host, {"get", "computer", "OwnerName"}).out, Not(HasSubstr("OwnerName  x")));
    EXPECT_THAT(look(host), HasSubstr("203.0.113.7/24"));
    EXPECT_EQ(cvagent(host, {"rollback"}).out, "change 1 is taken back\n");
    EXPECT_EQ(look(host), old_);
}

/// A script that says again and again what is so leaves what can be taken back.
HOST_TEST_F(Confirmed, ASetOfWhatIsSoAlreadyIsForgotten) {
    for (int i = 0; i < 3; ++i) {
        EXPECT_EQ(cvagent(host, {"set", "computer", "OwnerName", "x"}).status, 0);
        EXPECT_EQ(cvagent(host, {"set", "ip-config:eth0", "IPv4Address", kNewAddress}).status, 0);
    }
    EXPECT_EQ(stages(host), "1 is kept, 2 is kept");
}

/// What comes of it after its time is its work, too, and not somebody else's.
HOST_TEST_F(Confirmed, ASetThatTakesTooLongCanBeTakenBackWhole) {
    std::filesystem::remove("/tools/hostname");
    host.realTool("sleep");
    host.file("/tools/hostname",
              "#!/bin/sh\ncase $1 in slow*) exec sleep 1000;; esac\nexec /bin/hostname \"$@\"\n", 0755);
    const Finished run =
        cvagent(host, {"set", "ip-config:eth0", "HostName", "slow", "--command-timeout", "0.3"});
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.err, HasSubstr("timed out after 3 s: "));
    EXPECT_EQ(stages(host), "1 was broken off");
    host.file("/etc/HOSTNAME", "slow.example.com\n");
    EXPECT_EQ(cvagent(host, {"rollback"}).out, "change 1 is taken back\n");
    EXPECT_EQ(host.read("/etc/HOSTNAME"), "linux.example.com");
}

/// What nothing takes back is not saved, and nothing is told of it.
HOST_TEST_F(Confirmed, ADeedIsNotSaved) {
    host.directory("/var/lib/corvista/changes", 0700);
    host.readOnly("/var/lib/corvista/changes");
    const Finished value = cvagent(host, {"set", "computer", "OwnerName", "x"});
    EXPECT_EQ(value.status, 0) << value.err;
    EXPECT_THAT(value.err, HasSubstr("cvagent: the change cannot be taken back later: /var/lib/corvista/"
                                     "changes: Read-only file system\n"));
    const Finished deed = cvagent(host, {"set", "computer", "PowerAction", "9", "--yes"});
    EXPECT_THAT(deed.out, HasSubstr("new  9 (restart)"));
    EXPECT_THAT(deed.err, Not(HasSubstr("taken back")));
}

/// What apply has made without a confirmation can be taken back, too.
HOST_TEST_F(Confirmed, AnAppliedFileIsRolledBack) {
    host.file("/root/changes",
              R"([{"node": "ip-config:eth0", "property": "IPv4Gateway", "value": "203.0.113.1"},
                  {"node": "ip-config:eth0", "property": "SubnetMask", "value": "255.255.255.128"},
                  {"node": "computer", "property": "OwnerName", "value": "x"},
                  {"node": "ip-config:eth0", "property": "IPv4Address", "value": "203.0.113.7"}])");
    const Finished run = cvagent(host, {"apply", "/root/changes", "--verify-within", "0.1"});
    ASSERT_EQ(run.status, 0) << run.out << run.err;
    EXPECT_EQ(stages(host), "1 is kept");
    EXPECT_THAT(look(host), HasSubstr("203.0.113.7/25"));
    const Finished listed = cvagent(host, {"history", "--changes"});
    EXPECT_THAT(listed.out, HasSubstr("is kept"));
    EXPECT_THAT(listed.out, HasSubstr("and 3 more"));
    EXPECT_EQ(cvagent(host, {"rollback", "1"}).status, 0);
    EXPECT_EQ(look(host), old_);
    EXPECT_THAT(cvagent(host, {"get", "computer", "OwnerName"}).out, Not(HasSubstr("OwnerName  x")));
}

/// A step in the middle fails: all is back at once.
HOST_TEST_F(Confirmed, AStepThatFailsTakesAllBack) {
    host.file("/root/changes",
              R"([{"node": "ip-config:eth0", "property": "IPv4Address", "value": "203.0.113.7"},
                  {"node": "computer", "property": "OwnerName", "value": "x"}])");
    host.directory("/opt/vantrel/corvista/data", 0700);
    host.readOnly("/opt/vantrel/corvista/data");
    const Finished run = cvagent(host, {"apply", "/root/changes", "--force", "--confirm-within", "600"});
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.err, HasSubstr("change 1 is taken back"));
    EXPECT_THAT(run.out, HasSubstr("not made"));
    EXPECT_EQ(look(host), old_);
    EXPECT_EQ(stages(host), "1 is taken back");
}

/// Unasked, too; who insists goes as far as he comes.
HOST_TEST_F(Confirmed, AnAppliedFileOfWhichAStepFailsIsTakenBack) {
    host.file("/root/changes",
              R"([{"node": "ip-config:eth0", "property": "IPv4Address", "value": "203.0.113.7"},
                  {"node": "computer", "property": "OwnerName", "value": "x"}])");
    host.directory("/opt/vantrel/corvista/data", 0700);
    host.readOnly("/opt/vantrel/corvista/data");
    const Finished run = cvagent(host, {"apply", "/root/changes"});
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.err, HasSubstr("change 1 is taken back"));
    EXPECT_THAT(run.out, Not(HasSubstr("applied")));
    EXPECT_EQ(look(host), old_);
    EXPECT_THAT(cvagent(host, {"apply", "/root/changes", "--force", "--verify-within", "0"}).out,
                HasSubstr("applied    "));
    EXPECT_EQ(stages(host), "1 is taken back, 2 is kept");
}

/// However slow the host is: the guard is at work, but stands still until it is let go. Stopped with the
/// journal in its hands it would keep everybody waiting.
void holdGuard(FakeHost& host) {
    host.directory("/run/systemd/system");
    host.file(
        "/root/hold",
        "while [ \"$1\" != -- ]; do shift; done\n\"$2\" \"$3\" &\n"
        "until grep -q \"OFDLCK .*:$(stat -c %i /var/lib/corvista/changes/1/guard.lock) \" /.proc/locks\n"
        "do sleep 0.01; done\n"
        "stop() { kill -STOP $1; until grep -q '^State:.T' /.proc/$1/status; do :; done; }\n"
        "locked() { grep -q \"OFDLCK .*:$(stat -c %i /var/lib/corvista/changes/1/journal.lock) \" "
        "/.proc/locks; }\n"
        "stop $!\nwhile locked; do kill -CONT $!; sleep 0.01; stop $!; done\necho $! > /root/held\n");
    host.tool("/usr/bin/systemd-run %any", ToolAnswer{"", 0, "", 0, "sh /root/hold \"$@\""});
}

void letGuardGo(FakeHost& host) {
    kill(std::stoi(host.read("/root/held").value_or("0")), SIGCONT);
}

/// A caller whose connection goes with his own change has the host back.
HOST_TEST_F(Confirmed, WhoCutsHimselfOffHasTheHostBack) {
    int ready[2];
    int moved[2];
    ASSERT_EQ(pipe(ready) | pipe(moved), 0);
    const pid_t caller = fork();
    char mark = 0;
    if (caller == 0) {
        if (unshare(CLONE_NEWNET) != 0) {
            _exit(2);
        }
        static_cast<void>(!write(ready[1], "x", 1));
        static_cast<void>(!read(moved[0], &mark, 1));
        host.run({"sh", "-c", "ip address add 192.0.2.50/24 dev sw0; ip link set sw0 up"});
        sockaddr_in there{AF_INET, htons(7), {inet_addr("192.0.2.10")}, {}};
        const int line = socket(AF_INET, SOCK_STREAM, 0);
        if (connect(line, reinterpret_cast<const sockaddr*>(&there), sizeof there) != 0 ||
            write(line, "1", 1) != 1 || read(line, &mark, 1) != 1) {
            _exit(3);
        }
        // The host has its new address now, and this waits for its old one.
        const bool isThrough = write(line, "2", 1) == 1 && read(line, &mark, 1) == 1 && mark == '2';
        _exit(isThrough ? 0 : 4);
    }
    ASSERT_EQ(read(ready[0], &mark, 1), 1);
    const int door = socket(AF_INET, SOCK_STREAM, 0);
    sockaddr_in here{AF_INET, htons(7), {inet_addr("192.0.2.10")}, {}};
    ASSERT_EQ(bind(door, reinterpret_cast<const sockaddr*>(&here), sizeof here), 0);
    ASSERT_EQ(listen(door, 1), 0);
    ip(host, "link set sw0 netns " + std::to_string(caller));
    ASSERT_EQ(write(moved[1], "x", 1), 1);
    const int line = accept(door, nullptr, nullptr);
    ASSERT_EQ(read(line, &mark, 1), 1);
    holdGuard(host);
    const Finished run = set(host, "0.5");
    ASSERT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(run.err,
                HasSubstr("change 1 is taken back in 1 second unless somebody types: cvagent confirm 1"));
    letGuardGo(host);
    ASSERT_EQ(write(line, &mark, 1), 1);  // goes through when the address is back
    ASSERT_EQ(read(line, &mark, 1), 1);
    EXPECT_EQ(mark, '2');
    ASSERT_EQ(write(line, &mark, 1), 1);
    int status = 0;
    waitpid(caller, &status, 0);
    EXPECT_TRUE(WIFEXITED(status));
    EXPECT_EQ(WEXITSTATUS(status), 0);
}

/// A terminal's person who could cut himself off is asked for a confirmation, a script is not.
HOST_TEST_F(Confirmed, APersonAtATerminalIsGuardedUnasked) {
    const auto typed = [](std::vector<std::string> words) {
        words.insert(words.begin(), {CVAGENT_PROGRAM, "--plugin", CORVISTA_PLUGIN_FILE, "set"});
        return runOnTerminal(words, "").output;
    };
    EXPECT_THAT(typed({"computer", "OwnerName", "x"}), Not(HasSubstr("cvagent confirm")));
    EXPECT_THAT(typed({"ip-config:eth0", "IPv4Address", "203.0.113.8", "--confirm-within", "0"}),
                Not(HasSubstr("cvagent confirm")));
    EXPECT_EQ(stages(host), "1 is kept, 2 is kept");
    EXPECT_THAT(typed({"ip-config:eth0", "IPv4Address", "203.0.113.7"}),
                HasSubstr("in 60 seconds unless somebody types: cvagent confirm 3"));
    EXPECT_EQ(cvagent(host, {"confirm", "3"}).status, 0);
    EXPECT_EQ(cvagent(host, {"set", "ip-config:eth0", "IPv4Address", "203.0.113.9"}).status, 0);
    host.file("/root/script", "cvagent=$1; shift; \"$cvagent\" \"$@\"\n");
    const OnTerminal script =
        runOnTerminal({"/bin/sh", "/root/script", CVAGENT_PROGRAM, "--plugin", CORVISTA_PLUGIN_FILE, "set",
                       "ip-config:eth0", "IPv4Address", "203.0.113.10"},
                      "");
    EXPECT_EQ(script.status, 0) << script.output;
    EXPECT_THAT(script.output, Not(HasSubstr("cvagent confirm")));
    EXPECT_EQ(stages(host), "1 is kept, 2 is kept, 3 is kept, 4 is kept, 5 is kept");
}

/// sudo gives what it runs a process group of its own, also in a script.
HOST_TEST_F(Confirmed, BehindSudoItCountsWhoHasTypedThat) {
    host.realTool("setsid");
    host.file("/root/sudo", "#!/bin/sh\nsetsid \"$@\"\nexit $?\n", 0755);
    host.file("/root/script", "/root/sudo \"$@\"\nexit $?\n");
    const auto run = [](std::vector<std::string> words, const std::string& address) {
        words.insert(words.end(), {CVAGENT_PROGRAM, "--plugin", CORVISTA_PLUGIN_FILE, "set", "ip-config:eth0",
                                   "IPv4Address", address});
        const OnTerminal done = runOnTerminal(words, "");
        EXPECT_EQ(done.status, 0) << done.output;
        return done.output;
    };
    EXPECT_THAT(run({"/bin/sh", "/root/script"}, "203.0.113.7"), Not(HasSubstr("cvagent confirm")));
    EXPECT_EQ(stages(host), "1 is kept");
    EXPECT_THAT(run({"/root/sudo"}, "203.0.113.8"), HasSubstr("cvagent confirm 2"));
    const Finished back = cvagent(host, {"rollback", "2"});
    EXPECT_EQ(back.status, 0) << back.err;
}

/// Under systemd the guard is a unit, which outlives the session of who has started it.
HOST_TEST_F(Confirmed, TheGuardIsAUnitWhereSystemdRuns) {
    host.directory("/run/systemd/system");
    host.tool("/usr/bin/systemd-run %any",
              ToolAnswer{"", 0, "", 0, "while [ \"$1\" != -- ]; do shift; done; shift; \"$1\" \"$2\" &"});
    ASSERT_EQ(set(host, "600").status, 0);
    const auto calls = host.callsOf("/usr/bin/systemd-run");
    ASSERT_EQ(calls.size(), 1U);
    EXPECT_THAT(calls.front(), HasSubstr("--unit=corvista-guard-1 "));
    EXPECT_THAT(calls.front(), HasSubstr("--property=Restart=on-failure"));
    EXPECT_THAT(calls.front(), HasSubstr("--property=StartLimitIntervalSec=0")) << "however often";
    EXPECT_EQ(cvagent(host, {"rollback", "1"}).status, 0);
    EXPECT_EQ(look(host), old_);
}

/// The disk becomes full when the guard is at work.
/// @param room that is left, in bytes
void fillWhenGuarded(FakeHost& host, std::size_t room) {
    const std::string place = "/var/lib/corvista/changes";
    host.directory(place, 0700);
    ASSERT_EQ(mount("small", place.c_str(), "tmpfs", 0, "size=512k,mode=0700"), 0);
    host.file(place + "/spare", std::string(room, 'x'));
    host.file("/root/fill", "while [ \"$1\" != -- ]; do shift; done\n\"$2\" \"$3\" &\ncd " + place +
                                "\nwhile [ ! -e 1/guard.lock ]; do :; done\n"
                                "cat /dev/zero > fill 2>/dev/null\n: > spare\n");
    host.directory("/run/systemd/system");
    host.tool("/usr/bin/systemd-run %any", ToolAnswer{"", 0, "", 0, "sh /root/fill \"$@\""});
}

HOST_TEST_F(Confirmed, AChangeWhoseFirstStepCannotBeWrittenDownIsNotMade) {
    fillWhenGuarded(host, 0);
    const Finished run = set(host, "600");
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.err, HasSubstr("cannot be written down: journal: No space left on device"));
    EXPECT_EQ(look(host), old_);
}

/// Where nobody is to confirm it, and so no guard puts it back, half of a change is the worst.
HOST_TEST_F(Confirmed, AnAppliedFileWhoseStepsCannotBeWrittenDownIsMade) {
    const std::string place = "/var/lib/corvista/changes";
    host.directory(place, 0700);
    ASSERT_EQ(mount("small", place.c_str(), "tmpfs", 0, "size=512k,mode=0700"), 0);
    host.tool("hostname %any", "linux\n");
    host.tool("hostname earth.linux",
              ToolAnswer{"", 0, "", 0, "head -c 600000 /dev/zero 2>/dev/null >" + place + "/fill || :"});
    host.file("/root/changes",
              R"([{"node": "ip-config:eth0", "property": "HostName", "value": "earth"},
                  {"node": "computer", "property": "OwnerName", "value": "x"}])");
    const Finished run = cvagent(host, {"apply", "/root/changes", "--force", "--verify-within", "0"});
    EXPECT_THAT(run.err,
                HasSubstr("the change cannot be taken back later: the change cannot be written down: "
                          "journal: No space left on device"));
    EXPECT_THAT(run.out, HasSubstr("applied    /oshw/root/computer OwnerName  x\n"));
}

HOST_TEST_F(Confirmed, AChangeWhoseEndCannotBeWrittenDownIsTakenBack) {
    fillWhenGuarded(host, 4096);
    const Finished run = set(host, "600");
    EXPECT_EQ(run.status, 1) << run.out << run.err;
    EXPECT_THAT(run.err,
                HasSubstr("change 1 is taken back by its guard: the change cannot be written down: left: "));
    EXPECT_TRUE(comesBack(host));
}

HOST_TEST_F(Confirmed, WhatIsNoChangeIsRefused) {
    for (const auto& [words, status] : std::vector<std::pair<std::vector<std::string>, int>>{
             {{"confirm"}, 2},
             {{"confirm", "x"}, 2},
             {{"confirm", "0"}, 2},
             {{"confirm", "7"}, 3},
             {{"confirm", "../1"}, 2},
             {{"rollback", "7"}, 3},
             {{"rollback"}, 3},
             {{"rollback", "1", "2"}, 2},
             {{"confirm", "1", "--lengthen", "86401"}, 2}}) {
        EXPECT_EQ(cvagent(host, words).status, status) << words.back();
    }
    EXPECT_EQ(set(host, "86401").status, 2);
    EXPECT_EQ(set(host, "-1").status, 2);
    EXPECT_EQ(look(host), old_);
}

HOST_TEST_F(Confirmed, TheListTellsWhatIsNotBackAndWhatCannotBeRead) {
    EXPECT_EQ(cvagent(host, {"confirm", "7"}).err,
              "cvagent: there is no change 7\nThe changes are listed by: cvagent history --changes\n");
    const Finished none = cvagent(host, {"history", "--changes"});
    EXPECT_EQ(none.status, 0);
    EXPECT_EQ(none.err, "cvagent: no change has been made so far that could be taken back\n");
    ASSERT_EQ(set(host, "600").status, 0);
    host.file(file_, "somebody's\n", 0640);
    const Finished back = cvagent(host, {"rollback"});
    EXPECT_EQ(back.status, 1);
    const std::string note = file_ + " has been changed by somebody else since and stays as it is\n";
    EXPECT_EQ(back.err, "cvagent: not all of it:\n" + note);
    EXPECT_THAT(cvagent(host, {"history", "--changes"}).out, testing::EndsWith(")\n      " + note));
    host.file("/var/lib/corvista/changes/1/journal", "corvista-change 1\n1\nstage \x1b[2J");
    const Finished damaged = cvagent(host, {"history", "--changes"});
    EXPECT_EQ(damaged.status, 1);
    EXPECT_THAT(damaged.err, HasSubstr("cvagent: change 1: the journal cannot be read: "));
    EXPECT_THAT(damaged.err, Not(HasSubstr("\x1b")));
}

/// Where nothing can be kept the change is not begun.
HOST_TEST_F(Confirmed, AChangeThatCannotBeGuardedIsNotMade) {
    host.directory("/var/lib/corvista/changes", 0777);
    ASSERT_EQ(chmod("/var/lib/corvista/changes", 0777), 0);
    const Finished unsafe = set(host, "60");
    EXPECT_EQ(unsafe.status, 1);
    EXPECT_THAT(unsafe.err, HasSubstr("the change cannot be guarded: "));
    EXPECT_THAT(unsafe.err, HasSubstr("Nothing was done"));
    EXPECT_EQ(look(host), old_);
    ASSERT_EQ(chmod("/var/lib/corvista/changes", 0700), 0);
    host.fullDisk("/var/lib/corvista/changes");
    EXPECT_EQ(set(host, "60").status, 1);
    EXPECT_EQ(look(host), old_);
    host.restore("/var/lib/corvista/changes");
    host.readOnly("/var/lib/corvista");
    const Finished readOnly = set(host, "60");
    EXPECT_EQ(readOnly.status, 1);
    EXPECT_EQ(readOnly.err,
              "cvagent: the change cannot be guarded: /var/lib/corvista/changes: Read-only file system\n"
              "Nothing was done\n");
    EXPECT_EQ(look(host), old_);
}

}  // namespace
