#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <chrono>
#include <cstdlib>

#include "tests/support/fake_host.h"
#include "tests/support/shell.h"

using testing::AllOf;
using testing::HasSubstr;
using testing::Not;

namespace {

Shell broken(const std::string& name) {
    return shell(buildDirectory() + "/fakehost/broken_bodies --gtest_filter=Broken." + name + " 2>&1");
}

void expectFailure(const std::string& name, const testing::Matcher<std::string>& output) {
    Shell result = broken(name);
    EXPECT_EQ(result.status, 1) << name;
    EXPECT_THAT(result.out, AllOf(HasSubstr("[  FAILED  ] Broken." + name), output));
}

TEST(InFakeHost, PassesFailuresOn) {
    expectFailure("Expects", AllOf(HasSubstr("in the child"), HasSubstr("and goes on"),
                                   HasSubstr("broken_bodies.cpp:")));
    expectFailure("Asserts", AllOf(HasSubstr("fatal there"), Not(HasSubstr("not reached"))));
    expectFailure("CallsAnUnrecordedTool",
                  HasSubstr("no answer is recorded for the tool call: ethtool eth0 up"));
}

TEST(InFakeHost, PassesExceptionsOn) {
    expectFailure("Throws", HasSubstr("the body threw: thrown inside"));
    expectFailure("ThrowsANumber", HasSubstr("the body threw something"));
    expectFailure("CannotWrite", HasSubstr("the body threw: create /proc/self/nothing"));
}

TEST(InFakeHost, NoticesEveryWayToLeave) {
    expectFailure("IsKilled", HasSubstr("ended by signal 9"));
    expectFailure("Aborts", HasSubstr("ended by signal 6"));
    expectFailure("ExitsWithAStatus", HasSubstr("left with status 3"));
    expectFailure("ExitsEarlyAsIfAllWereWell", HasSubstr("left the program before its end"));
    expectFailure("NeverEnds", HasSubstr("did not end within 1 s"));
}

TEST(InFakeHost, PassesSkipsOn) {
    Shell result = broken("Skips");
    EXPECT_EQ(result.status, 0);
    EXPECT_THAT(result.out, AllOf(HasSubstr("not on this host"), HasSubstr("[  SKIPPED ] Broken.Skips")));
}

#if defined(__SANITIZE_ADDRESS__)
TEST(InFakeHost, PassesAddressAndLeakReportsOn) {
    expectFailure("Leaks", AllOf(HasSubstr("detected memory leaks"), HasSubstr("left with status")));
    expectFailure("ReadsFreedMemory", AllOf(HasSubstr("heap-use-after-free"), HasSubstr("left with status")));
}
#elif defined(__SANITIZE_THREAD__)
TEST(InFakeHost, PassesRaceReportsOn) {
    expectFailure("Races", AllOf(HasSubstr("data race"), HasSubstr("left with status 66")));
}
#endif

TEST(InFakeHost, EndsWhatTheBodyLeftRunning) {
    const auto begin = std::chrono::steady_clock::now();
    inFakeHost([](FakeHost&) { EXPECT_EQ(std::system("sleep 30 & sleep 30 >/dev/null 2>&1 &"), 0); });
    EXPECT_LT(std::chrono::steady_clock::now() - begin, std::chrono::seconds(10));
}

TEST(InFakeHost, LeavesTheCallersMemoryAlone) {
    int number = 1;
    inFakeHost([&](FakeHost&) { number = 2; });
    EXPECT_EQ(number, 1);
}

TEST(InFakeHost, LeavesNothingOpen) {
    auto descriptors = [] {
        int count = 0;
        for (int handle = 0; handle < 256; ++handle) {
            struct stat found;
            count += fstat(handle, &found) == 0;
        }
        return count;
    };
    const int before = descriptors();
    for (int round = 0; round < 5; ++round) inFakeHost([](FakeHost&) {});
    EXPECT_EQ(descriptors(), before);
}

class OnAHostOfMine : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override { host.file("/etc/prepared", "yes"); }
    void tearDownHost(FakeHost& host) override { EXPECT_EQ(host.read("/etc/result"), "done"); }
};

HOST_TEST_F(OnAHostOfMine, FixtureRunsInside) {
    EXPECT_EQ(host.read("/etc/prepared"), "yes");
    host.file("/etc/result", "done");
}

HOST_TEST_F(OnAHostOfMine, HasAHostForEachTest) {
    EXPECT_FALSE(host.exists("/etc/result"));
    host.file("/etc/result", "done");
}

}  // namespace
