// Whoever is killed, and whenever: the host is as before the change, or as after it, never in between.
#include <gmock/gmock.h>
#include <sys/mount.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <csignal>
#include <fstream>
#include <random>
#include <thread>

#include "agent/undo/boot_clock.h"
#include "agent/undo/making.h"
#include "agent/undo/taking_back.h"
#include "tests/support/amounts.h"
#include "tests/support/fake_host.h"
#include "tests/support/waiting.h"
#include "tests/undo/killed_at.h"
#include "tests/undo/waited_for.h"

namespace {

using cvagent::undo::bootMilliseconds;
using cvagent::undo::ChangeDirectory;
using cvagent::undo::ChangeError;
using cvagent::undo::ChangeInMaking;
using cvagent::undo::guardChange;
using cvagent::undo::Journal;
using cvagent::undo::kChangesPlace;
using cvagent::undo::MakingSettings;
using cvagent::undo::Stage;
using testing::AllOf;
using testing::HasSubstr;
using testing::IsEmpty;

constexpr std::uint64_t kLong = 600'000;

const auto kKills = numberFrom("CORVISTA_UNDO_KILLS", 100);
const auto kSeed = seedOfRun();

/// Runs it in a process of its own. @return the status of waitpid
template <class Body>
int inChild(Body body) {
    const pid_t child = fork();
    if (child == 0) {
        body();
        _exit(0);
    }
    int status = 0;
    waitpid(child, &status, 0);
    return status;
}

bool wasKilled(int status) {
    EXPECT_TRUE(WIFSIGNALED(status) || (WIFEXITED(status) && WEXITSTATUS(status) == 0)) << status;
    return WIFSIGNALED(status);
}

template <class Condition>
bool comesTrue(Condition condition) {
    const std::uint64_t end = bootMilliseconds() + 60'000;
    while (bootMilliseconds() < end) {
        if (condition()) {
            return true;
        }
        usleep(10'000);
    }
    return false;
}

class Guard : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        host.realTool("ip");
        host.useKernelNetwork();
        for (const char* each :
             {"link add eth0 address 02:00:00:00:00:10 type veth peer name sw0",
              "link set eth0 addrgenmode none", "link set sw0 addrgenmode none", "link set eth0 up",
              "link set sw0 up", "address add 192.0.2.10/24 dev eth0", "route add default via 192.0.2.1"}) {
            ip(host, each);
        }
        ASSERT_TRUE(carrierComes("eth0") && carrierComes("sw0"));
        host.file("/etc/one", "old one\n", 0640);
        host.file("/etc/two", "old two\n");
        host.directory(kChangesPlace, 0700);
        host.setHostName("old");
        old_ = look(host);
        makeSteps(host, [] {});
        new_ = look(host);
        unmake(host);
        EXPECT_EQ(look(host), old_);
    }

    static void ip(FakeHost& host, const std::string& words) {
        const Finished done = host.run({"sh", "-c", "ip " + words});
        EXPECT_EQ(done.status, 0) << words << ": " << done.err;
    }
    static MakingSettings settings(std::uint64_t window = kLong) {
        MakingSettings settings;
        settings.caller = "root";
        settings.summary = "a test";
        settings.paths = {"/etc/one", "/etc/two", "/etc/three"};
        settings.steps = 2;
        settings.window = window;
        return settings;
    }
    /// @param before is called before each of the two steps
    template <class Before>
    static void makeSteps(FakeHost& host, Before before) {
        before();
        host.file("/etc/one", "new one\n");
        ip(host, "address add 198.51.100.7/24 dev eth0");
        ip(host, "address del 192.0.2.10/24 dev eth0");
        before();
        host.remove("/etc/two");
        host.file("/etc/three", "new three\n");
        host.setHostName("new");
        ip(host, "route replace default via 198.51.100.1");
    }
    static void unmake(FakeHost& host) {
        host.remove("/etc/three");
        host.file("/etc/one", "old one\n", 0640);
        host.file("/etc/two", "old two\n");
        host.setHostName("old");
        ip(host, "address flush dev eth0");
        ip(host, "address add 192.0.2.10/24 dev eth0");
        ip(host, "route add default via 192.0.2.1");
    }
    static void make(FakeHost& host, const MakingSettings& settings) {
        ChangeInMaking making(settings);
        makeSteps(host, [&making] { making.beginStep(); });
        making.end();
    }
    static std::string files(FakeHost& host) {
        std::string all;
        for (const char* each : {"/etc/one", "/etc/two", "/etc/three"}) {
            struct stat found {};
            all += std::string(each) + (stat(each, &found) == 0 ? " " + std::to_string(found.st_mode) : "") +
                   " " + host.read(each).value_or("-\n");
        }
        return all;
    }
    static std::string look(FakeHost& host) {
        return files(host) + host.run({"ip", "-4", "address"}).out + host.run({"ip", "-4", "route"}).out +
               host.run({"uname", "-n"}).out;
    }
    /// The newest change; nothing before the first one.
    static std::optional<ChangeDirectory> newest() {
        const auto numbers = cvagent::undo::changesIn(kChangesPlace);
        return numbers.empty() ? std::nullopt : std::optional(ChangeDirectory(kChangesPlace, numbers.back()));
    }
    static Stage stage() { return newest()->journal().value_or(Journal{}).stage; }
    /// Ends what was left under way, as if its time were over.
    static void endNewest() {
        const auto change = newest();
        if (change && change->journal() && !change->journal()->isEnded()) {
            change->update([](Journal& journal) {
                journal.deadline = 0;
                return true;
            });
            guardChange(*change);
        }
    }

    std::string old_;
    std::string new_;
};

HOST_TEST_F(Guard, TakesBackWhatNobodyConfirms) {
    make(host, settings(1));
    EXPECT_EQ(look(host), new_);
    EXPECT_THAT(guardChange(*newest()), testing::ElementsAre("change 1: is taken back"));
    EXPECT_EQ(look(host), old_);
}

HOST_TEST_F(Guard, KeepsWhatIsConfirmed) {
    make(host, settings());
    EXPECT_EQ(stage(), Stage::made);
    confirmChange(*newest());
    EXPECT_THAT(guardChange(*newest()), IsEmpty());
    EXPECT_EQ(look(host), new_);
    EXPECT_EQ(stage(), Stage::kept);
    EXPECT_THROW(confirmChange(*newest()), ChangeError);
    EXPECT_THROW(lengthenChange(*newest(), 1000), ChangeError);
}

HOST_TEST_F(Guard, GivesMoreTime) {
    make(host, settings(1000));
    lengthenChange(*newest(), kLong);
    EXPECT_FALSE(newest()->journal()->isDue());
    lengthenChange(*newest(), 0);
    EXPECT_TRUE(newest()->journal()->isDue());
}

HOST_TEST_F(Guard, LeavesTheTimeThatWasGivenWhileTheChangeWasMade) {
    ChangeInMaking making(settings(kLong));
    making.beginStep();
    lengthenChange(making.directory(), 2 * kLong);
    const std::uint64_t deadline = newest()->journal()->deadline;
    EXPECT_EQ(making.end().deadline, deadline);
}

/// A change may set the clock itself; and whoever steers it may do so meanwhile.
HOST_TEST_F(Guard, DoesNotCareForTheTimeOfDay) {
    constexpr long kYear = 31'536'000;
    make(host, settings(300));
    const std::uint64_t begin = bootMilliseconds();
    const auto today = std::chrono::system_clock::now();
    moveTimeOfDay(-kYear);
    EXPECT_LT(std::chrono::system_clock::now(), today) << "it is moved for this program";
    guardChange(*newest());
    EXPECT_EQ(look(host), old_);
    make(host, settings());
    moveTimeOfDay(kYear);
    EXPECT_FALSE(newest()->journal()->isDue());
    EXPECT_LT(bootMilliseconds() - begin, kLong);
}

/// The maker, at each thing that lasts, from the saving to the confirmation.
HOST_TEST_F(Guard, TakesOverAtEachStepOfTheMaker) {
    int steps = 0;
    for (bool killed = true; killed && steps < 500;) {
        killed = wasKilled(inChild([&] {
            dieAtStep(steps + 1);
            make(host, settings());
            confirmChange(*newest());
            dieAtStep(0);
        }));
        steps += 1;
        endNewest();
        const bool isKept = newest() && stage() == Stage::kept;
        EXPECT_EQ(look(host), isKept ? new_ : old_) << steps;
        EXPECT_TRUE(!killed || !isKept || steps > 10);
        if (isKept) {
            rollBack(kChangesPlace, *newest());
            EXPECT_EQ(look(host), old_) << steps;
        }
    }
    EXPECT_GT(steps, 20);
}

/// The guard, at each thing that lasts, and the next one goes on.
HOST_TEST_F(Guard, IsFollowedByAnotherOneAtEachStep) {
    int steps = 0;
    for (bool killed = true; killed && steps < 500;) {
        make(host, settings(1));
        killed = wasKilled(inChild([&] {
            dieAtStep(steps + 1);
            guardChange(*newest());
        }));
        steps += 1;
        guardChange(*newest());
        EXPECT_EQ(stage(), Stage::takenBack) << steps;
        EXPECT_THAT(newest()->journal()->notes, IsEmpty()) << steps;
        EXPECT_EQ(look(host), old_) << steps;
    }
    EXPECT_GT(steps, 15);
}

/// The power is cut at each thing that lasts: the files are as before or as after, whatever the kernel begins
/// with.
HOST_TEST_F(Guard, PutsFilesBackAfterTheNextStart) {
    const std::string oldFiles = files(host);
    int steps = 0;
    for (bool killed = true; killed && steps < 500;) {
        killed = wasKilled(inChild([&] {
            dieAtStep(steps + 1);
            make(host, settings());
            confirmChange(*newest());
            dieAtStep(0);
        }));
        steps += 1;
        if (const auto change = newest(); change && change->journal()) {
            auto before = change->load("before");
            before->boot = "before";
            change->save("before", *before);
            change->update([](Journal& journal) {
                journal.boot = "before";
                return true;
            });
        }
        bool isWhole = true;
        cvagent::undo::takeBackAfterStart(kChangesPlace, isWhole);
        EXPECT_TRUE(isWhole) << steps;
        if (newest() && newest()->journal() && stage() == Stage::kept) {
            EXPECT_FALSE(killed && steps < 10);
            EXPECT_NE(files(host), oldFiles);
        } else {
            EXPECT_EQ(files(host), oldFiles) << steps;
        }
        unmake(host);
        host.remove(kChangesPlace);
        host.directory(kChangesPlace, 0700);
    }
    EXPECT_GT(steps, 20);
}

/// Maker and guard are two programs here, and each is killed when it happens. CORVISTA_UNDO_KILLS says how
/// often.
HOST_TEST_F(Guard, LeavesNothingHalfWhoeverIsKilled) {
    SCOPED_TRACE("CORVISTA_SEED=" + std::to_string(kSeed));
    std::mt19937 random(kSeed);
    for (unsigned long i = 0; i < kKills; ++i) {
        const pid_t maker = fork();
        if (maker == 0) {
            make(host, settings());
            confirmChange(*newest());
            _exit(0);
        }
        usleep(random() % 40'000);
        kill(maker, SIGKILL);
        waitpid(maker, nullptr, 0);
        const pid_t guard = fork();
        if (guard == 0) {
            endNewest();
            _exit(0);
        }
        usleep(random() % 20'000);
        kill(guard, SIGKILL);
        waitpid(guard, nullptr, 0);
        endNewest();
        const bool isKept = newest() && newest()->journal() && stage() == Stage::kept;
        ASSERT_EQ(look(host), isKept ? new_ : old_) << i;
        if (isKept) {
            rollBack(kChangesPlace, *newest());
            ASSERT_EQ(look(host), old_) << i;
        }
    }
}

/// A step that hangs: the host is back in time, and once more when what hung has written after all.
HOST_TEST_F(Guard, DoesNotWaitForAStepThatHangs) {
    const pid_t maker = fork();
    if (maker == 0) {
        ChangeInMaking making(settings(50));
        making.beginStep();
        host.file("/etc/one", "new one\n");
        while (host.read("/etc/one") != "old one\n") {
            usleep(1000);
        }
        host.file("/etc/two", "late\n");
        try {
            making.beginStep();
        } catch (const ChangeError&) {
            _exit(7);
        }
        _exit(1);
    }
    EXPECT_TRUE(comesTrue([&host] { return host.read("/etc/one") == "new one\n"; }));
    guardChange(*newest());
    int status = 0;
    waitpid(maker, &status, 0);
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 7) << "the next step does not begin";
    EXPECT_EQ(look(host), old_);
    EXPECT_EQ(stage(), Stage::takenBack);
}

/// Who makes the change is killed, and a command that he has started goes on.
HOST_TEST_F(Guard, WaitsForACommandThatIsLeftBehind) {
    host.file("/run/wait", "");
    const pid_t maker = fork();
    if (maker == 0) {
        ChangeInMaking making(settings());
        making.beginStep();
        host.file("/etc/one", "new one\n");
        execlp("sh", "sh", "-c",
               "(while [ -e /run/wait ]; do sleep 0.01; done; echo late > /etc/two) & kill -9 $$", nullptr);
    }
    waitpid(maker, nullptr, 0);
    const pid_t guard = fork();
    if (guard == 0) {
        guardChange(*newest());
        _exit(0);
    }
    EXPECT_TRUE(comesTrue([&host] { return host.read("/etc/one") == "old one\n"; }));
    host.remove("/run/wait");
    waitpid(guard, nullptr, 0);
    EXPECT_EQ(look(host), old_);
    EXPECT_EQ(stage(), Stage::takenBack);
}

/// Who makes the change is killed, and the service that does its steps goes on. Its time passes when it has
/// written.
HOST_TEST_F(Guard, WaitsForAServiceThatGoesOn) {
    MakingSettings ofService = settings();
    ofService.settling = kLong;
    const pid_t maker = fork();
    if (maker == 0) {
        ChangeInMaking making(ofService);
        making.beginStep();
        host.file("/etc/one", "new one\n");
        _exit(0);
    }
    waitpid(maker, nullptr, 0);
    std::atomic<bool> hasWritten = false;
    std::jthread service([&](const std::stop_token& over) {
        hasWritten = comesTrue([&host] { return host.read("/etc/one") == "old one\n"; });
        host.file("/etc/two", "late\n");
        while (!over.stop_requested()) {
            passTime(std::chrono::milliseconds(kLong));
            usleep(1000);
        }
    });
    guardChange(*newest());
    service = {};
    EXPECT_TRUE(hasWritten);
    EXPECT_EQ(look(host), old_);
    EXPECT_EQ(stage(), Stage::takenBack);
}

HOST_TEST_F(Guard, OneIsEnough) {
    make(host, settings());
    const auto held = newest()->take(cvagent::undo::kGuardLock);
    EXPECT_THAT(guardChange(*newest()), IsEmpty());
    EXPECT_EQ(look(host), new_);
}

HOST_TEST_F(Guard, OfWhatCannotBeReadSaysSo) {
    make(host, settings(1));
    host.file(std::string(kChangesPlace) + "/1/before", "corvista-saved 1\n1\nfile 99999999\n");
    EXPECT_THAT(guardChange(*newest()),
                testing::ElementsAre(HasSubstr("change 1: cannot be taken back; what was saved")));
    EXPECT_EQ(stage(), Stage::failed);
    host.file(std::string(kChangesPlace) + "/1/journal", "garbage");
    EXPECT_THROW(newest()->journal(), ChangeError);
    EXPECT_EQ(ChangeInMaking(settings()).number(), 2U);
}

HOST_TEST_F(Guard, TrustsNoDirectoryThatOthersCanWrite) {
    make(host, settings(1));
    ASSERT_EQ(chmod((std::string(kChangesPlace) + "/1").c_str(), 0770), 0);
    EXPECT_THROW(ChangeDirectory(kChangesPlace, 1), ChangeError);
    ASSERT_EQ(chmod((std::string(kChangesPlace) + "/1").c_str(), 0700), 0);
    ASSERT_EQ(chmod(kChangesPlace, 0777), 0);
    EXPECT_THROW(ChangeDirectory(kChangesPlace, 1), ChangeError);
    ASSERT_EQ(chmod(kChangesPlace, 0700), 0);
    host.symlink(std::string(kChangesPlace) + "/7", "1");
    EXPECT_THROW(ChangeDirectory(kChangesPlace, 7), ChangeError);
    for (const char* word :
         {"", "0", "-1", "+1", "1x", "../1", "1/..", "0x1", "1000000000", "99999999999999999999"}) {
        EXPECT_FALSE(cvagent::undo::changeNumber(word)) << word;
    }
}

HOST_TEST_F(Guard, KeepsTwoApart) {
    make(host, settings());
    EXPECT_THROW(make(host, settings()), ChangeError) << "the first one waits";
    confirmChange(*newest());
    {
        ChangeInMaking second(settings());
        host.file("/etc/one", "second\n");
        second.end();
    }
    confirmChange(*newest());
    host.file("/etc/one", "somebody's\n");
    {
        ChangeInMaking third(settings());
        host.file("/etc/one", "third\n");
        third.end();
    }
    confirmChange(*newest());
    EXPECT_THROW(rollBack(kChangesPlace, ChangeDirectory(kChangesPlace, 1)), ChangeError);
    EXPECT_EQ(cvagent::undo::lastStanding(kChangesPlace), 3U);
    rollBack(kChangesPlace, *newest());
    EXPECT_EQ(host.read("/etc/one"), "somebody's\n");
    EXPECT_EQ(cvagent::undo::lastStanding(kChangesPlace), 2U);
    EXPECT_THAT(rollBack(kChangesPlace, ChangeDirectory(kChangesPlace, 2)).notes,
                testing::ElementsAre("/etc/one has been changed by somebody else since and stays as it is"));
    rollBack(kChangesPlace, ChangeDirectory(kChangesPlace, 1));
    EXPECT_EQ(host.read("/etc/two"), "old two\n");
    EXPECT_EQ(cvagent::undo::lastStanding(kChangesPlace), std::nullopt);
}

/// One that has not come to its first step yet counts, too.
HOST_TEST_F(Guard, KeepsApartWhatIsAboutToBegin) {
    ChangeInMaking first(settings(0));
    EXPECT_THROW(ChangeInMaking{settings()}, ChangeError);
    first.beginStep();
    EXPECT_THROW(ChangeInMaking{settings(0)}, ChangeError);
    first.end();
}

/// Also one that nobody was to confirm: who has begun to take it back may have been killed at it.
HOST_TEST_F(Guard, BeginsNothingBesideWhatIsBeingTakenBack) {
    make(host, settings(0));
    newest()->update([](Journal& journal) {
        journal.stage = Stage::takingBack;
        return true;
    });
    EXPECT_THAT([] { ChangeInMaking{settings(0)}; },
                testing::ThrowsMessage<ChangeError>("change 1 is being taken back; when nobody is at it: "
                                                    "cvagent rollback 1"));
    rollBack(kChangesPlace, *newest());
    EXPECT_EQ(look(host), old_);
    EXPECT_EQ(ChangeInMaking(settings(0)).number(), 2U);
}

HOST_TEST_F(Guard, TakesNothingBackBelowWhatIsAboutToBegin) {
    make(host, settings(0));
    {
        ChangeInMaking second(settings(0));
        EXPECT_THROW(rollBack(kChangesPlace, ChangeDirectory(kChangesPlace, 1)), ChangeError);
    }
    rollBack(kChangesPlace, ChangeDirectory(kChangesPlace, 1));
    EXPECT_EQ(look(host), old_);
}

/// Whoever begins one at the same time comes first or finds it marked.
HOST_TEST_F(Guard, LetsNobodyBeginWhileItLooks) {
    make(host, settings(0));
    auto beginning = std::optional(ChangeDirectory::lockPlace(kChangesPlace));
    const pid_t other = fork();
    if (other == 0) {
        beginning.reset();
        try {
            rollBack(kChangesPlace, ChangeDirectory(kChangesPlace, 1));
        } catch (const ChangeError&) {
            _exit(7);
        }
        _exit(0);
    }
    EXPECT_TRUE(comesTrue([&] { return isWaitedFor(host, kChangesPlace) || stage() != Stage::kept; }));
    ChangeDirectory::make(kChangesPlace).update([](Journal& journal) {
        journal.stage = Stage::changing;
        return true;
    });
    beginning.reset();
    int status = 0;
    waitpid(other, &status, 0);
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 7) << status;
    EXPECT_EQ(look(host), new_);
}

HOST_TEST_F(Guard, GivesNoTimeWhenItIsOver) {
    make(host, settings(1));
    EXPECT_TRUE(comesTrue([] { return newest()->journal()->isDue(); }));
    EXPECT_THROW(confirmChange(*newest()), ChangeError);
    EXPECT_THROW(lengthenChange(*newest(), kLong), ChangeError);
    guardChange(*newest());
    EXPECT_EQ(look(host), old_);
}

/// How often a process has waited for something.
long waitsOf(const FakeHost& host, pid_t process) {
    const std::string status = host.read("/.proc/" + std::to_string(process) + "/status").value_or("");
    const std::string name = "\nvoluntary_ctxt_switches:";
    const std::size_t at = status.find(name);
    return at == status.npos ? 0 : std::stol(status.substr(at + name.size()));
}

/// It is the last moment: what the guard has seen is not so any more when it marks the change.
HOST_TEST_F(Guard, JudgesByWhatIsWrittenThen) {
    make(host, settings());
    Journal journal = newest()->journal().value_or(Journal{});
    const std::string longer = textOf(journal);
    journal.stage = Stage::changing;
    journal.deadline = 0;
    const std::string place = std::string(kChangesPlace) + "/1/journal";
    host.file(place, textOf(journal), 0600);
    auto locked = std::optional(newest()->take("journal.lock"));
    const pid_t guard = fork();
    if (guard == 0) {
        locked.reset();
        execl(GUARD_PROGRAM, GUARD_PROGRAM, "1", nullptr);
    }
    EXPECT_TRUE(comesTrue([&] { return isWaitedFor(host, place + ".lock"); }));
    host.file(place, longer, 0600);
    const long waits = waitsOf(host, guard);
    locked.reset();
    EXPECT_TRUE(comesTrue([&] { return waitsOf(host, guard) > waits + 2 || stage() == Stage::takenBack; }));
    confirmChange(*newest());
    int status = 0;
    waitpid(guard, &status, 0);
    EXPECT_EQ(status, 0);
    EXPECT_EQ(look(host), new_);
    EXPECT_EQ(stage(), Stage::kept);
}

/// What nobody can write down is done all the same.
HOST_TEST_F(Guard, PutsBackInTimeOnAFullDisk) {
    ASSERT_EQ(mount("small", kChangesPlace, "tmpfs", 0, "size=256k,mode=0700"), 0) << errno;
    make(host, settings(1));
    const std::string ballast = std::string(kChangesPlace) + "/ballast";
    std::ofstream(ballast) << std::string(300'000, 'x') << std::flush;
    EXPECT_THROW(newest()->save("left", {}), ChangeError);
    const pid_t guard = fork();
    if (guard == 0) {
        guardChange(*newest());
        _exit(0);
    }
    EXPECT_TRUE(comesTrue([&] { return look(host) == old_; }));
    EXPECT_EQ(stage(), Stage::made);
    host.remove(ballast);
    int status = 0;
    waitpid(guard, &status, 0);
    EXPECT_EQ(status, 0);
    EXPECT_EQ(stage(), Stage::takenBack);
    EXPECT_THAT(newest()->journal()->notes, IsEmpty());
    EXPECT_EQ(look(host), old_);
}

/// What has no room leaves nothing that takes away room.
HOST_TEST_F(Guard, RefusesAChangeThatHasNoRoom) {
    ASSERT_EQ(mount("small", kChangesPlace, "tmpfs", 0, "size=256k,mode=0700"), 0) << errno;
    std::ofstream(std::string(kChangesPlace) + "/ballast") << std::string(300'000, 'x') << std::flush;
    EXPECT_THROW(make(host, settings()), ChangeError);
    EXPECT_EQ(look(host), old_);
    EXPECT_THAT(cvagent::undo::changesIn(kChangesPlace), IsEmpty()) << "the place of an older one";
}

HOST_TEST_F(Guard, CountsNoFurtherThanPeopleCanName) {
    host.directory(std::string(kChangesPlace) + "/999999999", 0700);
    EXPECT_THROW(make(host, settings()), ChangeError);
    EXPECT_EQ(look(host), old_);
}

/// One that cannot be read keeps nobody from a new change.
HOST_TEST_F(Guard, ForgetsOldChangesBehindOneThatIsDamaged) {
    host.directory(std::string(kChangesPlace) + "/1", 0700);
    host.file(std::string(kChangesPlace) + "/1/journal", "garbage");
    host.file(std::string(kChangesPlace) + "/2", "no directory");
    for (int i = 3; i < 60; ++i) {
        host.directory(std::string(kChangesPlace) + "/" + std::to_string(i), 0700);
    }
    EXPECT_EQ(ChangeInMaking(settings(0)).number(), 60U);
    const auto numbers = cvagent::undo::changesIn(kChangesPlace);
    EXPECT_EQ(numbers.size(), 53U) << "fifty, the new one, and the two";
    EXPECT_EQ(numbers.front(), 1U);
}

HOST_TEST_F(Guard, ForgetsOldChanges) {
    for (int i = 0; i < 60; ++i) {
        ChangeInMaking making(settings(0));
        making.beginStep();
        host.file("/etc/one", std::to_string(i));
        making.end();
    }
    const auto numbers = cvagent::undo::changesIn(kChangesPlace);
    EXPECT_EQ(numbers.size(), 51U);
    EXPECT_EQ(numbers.back(), 60U);
}

/// A host with very many routes has much to save each time.
HOST_TEST_F(Guard, ForgetsOldChangesThatTakeMuchRoom) {
    for (int i = 0; i < 4; ++i) {
        ChangeInMaking making(settings(0));
        making.beginStep();
        host.file("/etc/one", std::to_string(i));
        making.end();
        const std::string saved = std::string(kChangesPlace) + "/" + std::to_string(i + 1) + "/before";
        ASSERT_EQ(truncate(saved.c_str(), off_t{30} << 20U), 0);
    }
    const ChangeInMaking next(settings(0));
    EXPECT_THAT(cvagent::undo::changesIn(kChangesPlace), testing::ElementsAre(3, 4, 5)) << "60 MiB";
}

HOST_TEST_F(Guard, ForgetsAChangeThatHasLeftEverythingAsItWas) {
    const auto after = [&host](const std::function<void()>& change) {
        ChangeInMaking making(settings(0));
        making.beginStep();
        change();
        EXPECT_EQ(making.end().stage, Stage::kept);
        return cvagent::undo::changesIn(kChangesPlace).size();
    };
    EXPECT_EQ(after([] {}), 0U);
    EXPECT_EQ(after([&host] { host.file("/etc/one", "old one\n", 0640); }), 0U) << "written again";
    EXPECT_EQ(after([&host] { host.file("/etc/one", "old one\n", 0600); }), 1U);
    EXPECT_EQ(after([&host] { host.setHostName("new"); }), 2U);
    EXPECT_EQ(after([&host] { ip(host, "link set sw0 mtu 1400"); }), 3U);
    EXPECT_EQ(after([&host] { ip(host, "address add 198.51.100.7/24 dev eth0"); }), 4U);
    EXPECT_EQ(after([&host] { ip(host, "route replace default via 198.51.100.1"); }), 5U);
}

/// What others do to it meanwhile is none of its business, whether it comes to its end or not.
HOST_TEST_F(Guard, LeavesTheNetworkOfAChangeThatDoesNotTouchIt) {
    MakingSettings files = settings(0);
    files.hasNetwork = false;
    for (const bool isWhole : {true, false}) {
        {
            ChangeInMaking making(files);
            making.beginStep();
            host.file("/etc/one", "new one\n");
            ip(host, "address add 198.51.100.7/24 dev eth0");
            if (isWhole) {
                making.end();
            }
        }
        EXPECT_THAT(cvagent::undo::rollBack(kChangesPlace, *newest()).notes, IsEmpty());
        EXPECT_EQ(host.read("/etc/one"), "old one\n");
        EXPECT_THAT(look(host), AllOf(HasSubstr("192.0.2.10/24"), HasSubstr("198.51.100.7/24")));
        ip(host, "address del 198.51.100.7/24 dev eth0");
    }
}

// The program itself.

HOST_TEST_F(Guard, ProgramOutlivesWhoStartsIt) {
    const pid_t maker = fork();
    if (maker == 0) {
        setsid();
        ChangeInMaking making(settings());
        EXPECT_EQ(host.run({GUARD_PROGRAM, "--detach", std::to_string(making.number())}).status, 0);
        while (!making.directory().isTaken(cvagent::undo::kGuardLock)) {
            usleep(1000);
        }
        makeSteps(host, [&making] { making.beginStep(); });
        kill(0, SIGTERM);  // the whole session
        raise(SIGKILL);
    }
    waitpid(maker, nullptr, 0);
    EXPECT_TRUE(comesTrue([] { return stage() == Stage::takenBack; }));
    EXPECT_EQ(look(host), old_);
}

/// The numbers of the processes of the guard, the one above first.
std::vector<pid_t> guards(const FakeHost& host) {
    std::vector<pid_t> found;
    for (const std::string& name : host.listDirectory("/.proc")) {
        const std::string words = host.read("/.proc/" + name + "/cmdline").value_or("");
        if (words.find("corvista-guard") != words.npos) {
            found.push_back(std::stoi(name));
        }
    }
    std::ranges::sort(found);
    return found;
}

HOST_TEST_F(Guard, ProgramComesBackWhenItIsKilled) {
    make(host, settings());
    ASSERT_EQ(host.run({GUARD_PROGRAM, "--detach", "1"}).status, 0);
    ASSERT_TRUE(comesTrue([] { return newest()->isTaken(cvagent::undo::kGuardLock); }));
    const std::vector<pid_t> two = guards(host);
    ASSERT_EQ(two.size(), 2U);
    kill(two.back(), SIGTERM);
    kill(two.back(), SIGKILL);
    EXPECT_TRUE(comesTrue([&] { return guards(host).size() == 2 && guards(host).back() != two.back(); }));
    EXPECT_TRUE(comesTrue([] { return newest()->isTaken(cvagent::undo::kGuardLock); }));
    lengthenChange(*newest(), 0);
    EXPECT_TRUE(comesTrue([] { return stage() == Stage::takenBack; }));
    EXPECT_EQ(look(host), old_);
    EXPECT_TRUE(comesTrue([&] { return guards(host).empty(); }));
}

/// Stops it; where that hits it with the journal in its hands, lets it go on.
bool isStoppedBetweenLooks(const FakeHost& host, pid_t guard) {
    kill(guard, SIGSTOP);
    const std::string place = "/.proc/" + std::to_string(guard) + "/stat";
    const bool isStopped =
        comesTrue([&] { return host.read(place).value_or("").find(") T ") != std::string::npos; });
    if (isStopped && !ChangeDirectory(kChangesPlace, cvagent::undo::changesIn(kChangesPlace).back())
                          .isTaken("journal.lock")) {
        return true;
    }
    kill(guard, SIGCONT);
    return false;
}

/// A guard that is stopped while the change is made, beyond its time.
HOST_TEST_F(Guard, ProgramThatWasStoppedGoesOnWithItsWork) {
    for (const bool byHand : {false, true}) {
        ChangeInMaking making(settings());
        const std::string number = std::to_string(making.number());
        ASSERT_EQ(host.run({GUARD_PROGRAM, "--detach", number}).status, 0);
        ASSERT_TRUE(comesTrue([] { return newest()->isTaken(cvagent::undo::kGuardLock); }));
        const pid_t guard = guards(host).back();
        ASSERT_TRUE(comesTrue([&] { return isStoppedBetweenLooks(host, guard); }));
        makeSteps(host, [&making] { making.beginStep(); });
        making.end();
        lengthenChange(*newest(), 0);
        EXPECT_THROW(confirmChange(*newest()), ChangeError) << "its time is over";
        EXPECT_EQ(look(host), new_);
        if (byHand) {
            EXPECT_EQ(rollBack(kChangesPlace, *newest()).stage, Stage::takenBack);
            EXPECT_EQ(look(host), old_);
        }
        ASSERT_EQ(kill(guard, SIGCONT), 0);
        EXPECT_TRUE(comesTrue([] { return stage() == Stage::takenBack; }));
        EXPECT_TRUE(comesTrue([&] { return guards(host).empty(); }));
        EXPECT_EQ(look(host), old_);
    }
}

/// A unit is started again only behind an end that is none of its own.
HOST_TEST_F(Guard, ProgramThatIsAskedToEndFails) {
    make(host, settings());
    const pid_t guard = fork();
    if (guard == 0) {
        execl(GUARD_PROGRAM, GUARD_PROGRAM, "1", nullptr);
    }
    ASSERT_TRUE(comesTrue([] { return newest()->isTaken(cvagent::undo::kGuardLock); }));
    kill(guard, SIGTERM);
    int status = 0;
    waitpid(guard, &status, 0);
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 1) << status;
    EXPECT_EQ(stage(), Stage::made);
}

/// Another guard would find no more than this one.
HOST_TEST_F(Guard, ProgramEndsWellWhenSomebodyRemovesTheChange) {
    make(host, settings());
    const pid_t guard = fork();
    if (guard == 0) {
        execl(GUARD_PROGRAM, GUARD_PROGRAM, "1", nullptr);
    }
    ASSERT_TRUE(comesTrue([] { return newest()->isTaken(cvagent::undo::kGuardLock); }));
    int status = 0;
    kill(guard, SIGSTOP);  // it could make a file while this removes them
    waitpid(guard, &status, WUNTRACED);
    EXPECT_TRUE(WIFSTOPPED(status));
    host.remove(std::string(kChangesPlace) + "/1");
    kill(guard, SIGCONT);
    waitpid(guard, &status, 0);
    EXPECT_EQ(status, 0);
    EXPECT_EQ(look(host), new_);
}

/// The unit that does it fails, for somebody has to look.
HOST_TEST_F(Guard, ProgramFailsWhenNotAllIsBackAfterAStart) {
    make(host, settings());
    newest()->update([](Journal& journal) {
        journal.boot = "before";
        return true;
    });
    host.file(std::string(kChangesPlace) + "/1/before", "garbage");
    const Finished first = host.run({GUARD_PROGRAM, "--after-start"});
    EXPECT_EQ(first.status, 1);
    EXPECT_THAT(first.err, HasSubstr("change 1: cannot be taken back; what was saved cannot be read"));
    EXPECT_EQ(host.run({GUARD_PROGRAM, "--after-start"}).status, 0) << "it is told once";
    host.file(std::string(kChangesPlace) + "/1/journal", "garbage");
    EXPECT_EQ(host.run({GUARD_PROGRAM, "--after-start"}).status, 1);
}

HOST_TEST_F(Guard, ProgramRefusesWhatIsNoNumber) {
    for (const std::vector<std::string>& words : std::vector<std::vector<std::string>>{
             {}, {"0"}, {"../1"}, {"--detach"}, {"--detach", "x"}, {"1", "2"}, {"--after-start", "1"}}) {
        std::vector<std::string> all{GUARD_PROGRAM};
        all.insert(all.end(), words.begin(), words.end());
        EXPECT_EQ(host.run(all).status, 2);
    }
    EXPECT_EQ(host.run({GUARD_PROGRAM, "9"}).status, 1);
    EXPECT_EQ(host.run({GUARD_PROGRAM, "--after-start"}).status, 0);
    EXPECT_THAT(host.run({GUARD_PROGRAM, "--help"}).out, HasSubstr("Usage"));
}

}  // namespace
