// Work that may wait for a device: nothing waits longer for it than the limit.
#include "plugins/hardware/deadline_runner.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <condition_variable>
#include <csignal>
#include <mutex>
#include <set>
#include <stdexcept>
#include <thread>

#include "tests/support/waiting.h"

namespace {

using hardware::DeadlineRunner;
using std::chrono::milliseconds;
using std::chrono::steady_clock;

constexpr milliseconds kLimit{1000};  // longer than the machine keeps a thread waiting
constexpr milliseconds kLong{10000};

/// A device that does not answer before it is released.
class Stuck {
public:
    std::function<void()> work() {
        return [state = state_] {
            std::unique_lock lock(state->guard);
            ++state->inside;
            state->changed.wait(lock, [&] { return state->released; });
            --state->inside;
        };
    }
    void release() {
        const std::lock_guard lock(state_->guard);
        state_->released = true;
        state_->changed.notify_all();
    }
    int inside() const {
        const std::lock_guard lock(state_->guard);
        return state_->inside;
    }
    ~Stuck() {
        release();
        EXPECT_TRUE(eventually([this] { return inside() == 0; }));
    }

private:
    struct State {
        std::mutex guard;
        std::condition_variable changed;
        bool released = false;
        int inside = 0;
    };
    std::shared_ptr<State> state_ = std::make_shared<State>();
};

milliseconds lasted(const std::function<void()>& what) {
    const auto start = steady_clock::now();
    what();
    return std::chrono::duration_cast<milliseconds>(steady_clock::now() - start);
}

std::vector<std::string> devices(std::size_t count) {
    std::vector<std::string> names;
    for (std::size_t place = 0; place < count; ++place) {
        names.push_back("device" + std::to_string(place));
    }
    return names;
}

TEST(DeadlineRunner, WorkIsDoneInAnotherThread) {
    DeadlineRunner runner(kLong);
    std::thread::id there;
    EXPECT_TRUE(runner.run("a", [&] { there = std::this_thread::get_id(); }));
    EXPECT_NE(there, std::thread::id());
    EXPECT_NE(there, std::this_thread::get_id());
}

TEST(DeadlineRunner, WorkThatThrowsIsDone) {
    DeadlineRunner runner(kLong);
    EXPECT_TRUE(runner.run("a", [] { throw std::runtime_error("no memory"); }));
    EXPECT_TRUE(runner.run("a", [] {}));
}

TEST(DeadlineRunner, ADeviceThatHangsCostsTheLimitOnce) {
    Stuck stuck;
    DeadlineRunner runner(kLimit);
    EXPECT_GE(lasted([&] { EXPECT_FALSE(runner.run("a", stuck.work())); }), kLimit);
    std::atomic<bool> asked = false;
    const auto again = lasted([&] { EXPECT_FALSE(runner.run("a", [&] { asked = true; })); });
    EXPECT_LT(again, kLimit);
    EXPECT_FALSE(asked) << "only one question at a time";
    EXPECT_TRUE(runner.run("b", [] {})) << "others are not concerned";
}

TEST(DeadlineRunner, ADeviceThatAnswersAgainIsAskedAgain) {
    Stuck stuck;
    DeadlineRunner runner(kLimit);
    EXPECT_FALSE(runner.run("a", stuck.work()));
    stuck.release();
    EXPECT_TRUE(eventually([&] { return runner.run("a", [] {}); }));
}

TEST(DeadlineRunner, WorkForOneDeviceRunsOneAtATime) {
    DeadlineRunner runner(kLong);
    std::atomic<int> inside = 0;
    std::atomic<int> most = 0;
    std::atomic<int> done = 0;
    std::vector<std::thread> callers;
    for (int caller = 0; caller < 8; ++caller) {
        callers.emplace_back([&] {
            for (int round = 0; round < 50; ++round) {
                done += runner.run("a", [&] {
                    most = std::max(most.load(), ++inside);
                    std::this_thread::yield();
                    --inside;
                });
            }
        });
    }
    for (std::thread& caller : callers) {
        caller.join();
    }
    EXPECT_EQ(most, 1);
    EXPECT_EQ(done, 400);
}

TEST(DeadlineRunner, ManyCallersForManyDevicesAllGetTheirs) {
    DeadlineRunner runner(kLong);
    std::atomic<int> done = 0;
    std::vector<std::thread> callers;
    for (int caller = 0; caller < 40; ++caller) {
        callers.emplace_back([&, caller] {
            for (int round = 0; round < 20; ++round) {
                done += runner.run(std::to_string(caller), [] { std::this_thread::yield(); });
            }
        });
    }
    for (std::thread& caller : callers) {
        caller.join();
    }
    EXPECT_EQ(done, 800);
}

TEST(DeadlineRunner, ThreadsAreBounded) {
    Stuck stuck;
    const std::size_t before = runningThreads();
    DeadlineRunner runner(milliseconds(5));
    for (const std::string& device : devices(30)) {
        EXPECT_FALSE(runner.run(device, stuck.work()));
    }
    EXPECT_LE(runningThreads() - before, 16U);
    EXPECT_FALSE(runner.run("another", [] {})) << "all threads hang";
    stuck.release();
    EXPECT_TRUE(eventually([&] { return runner.run("another", [] {}); }));
}

TEST(DeadlineRunner, WorkThatHangsOutlivesIt) {
    Stuck stuck;
    auto owned = std::make_shared<int>(1);
    const std::weak_ptr<int> watched = owned;
    {
        DeadlineRunner runner(kLimit);
        EXPECT_FALSE(runner.run("a", [work = stuck.work(), owned] { work(); }));
        owned.reset();
        EXPECT_LT(lasted([&] { runner.run("b", [] {}); }), kLong);
    }
    EXPECT_FALSE(watched.expired()) << "it still uses what it owns";
    stuck.release();
    EXPECT_TRUE(eventually([&] { return watched.expired(); }));
}

TEST(DeadlineRunner, ItsThreadsGoWithIt) {
    const std::size_t before = runningThreads();
    {
        DeadlineRunner runner(kLong);
        runner.run("a", [] {});
        EXPECT_GT(runningThreads(), before);
    }
    EXPECT_TRUE(eventually([&] { return runningThreads() == before; }));
}

TEST(DeadlineRunner, ItsThreadsGetNoSignals) {
    DeadlineRunner runner(kLong);
    sigset_t blocked;
    sigemptyset(&blocked);
    runner.run("a", [&] { pthread_sigmask(SIG_BLOCK, nullptr, &blocked); });
    EXPECT_EQ(sigismember(&blocked, SIGTERM), 1);
    sigset_t own;
    pthread_sigmask(SIG_BLOCK, nullptr, &own);
    EXPECT_EQ(sigismember(&own, SIGTERM), 0);
}

TEST(DeadlineRunnerWithMany, AllAreAskedInOrderByOneThread) {
    DeadlineRunner runner(kLong);
    std::vector<std::size_t> places;
    std::set<std::thread::id> threads;
    const std::vector<bool> done = runner.runAll(devices(100), [&](std::size_t place) {
        places.push_back(place);
        threads.insert(std::this_thread::get_id());
    });
    EXPECT_EQ(done, std::vector<bool>(100, true));
    EXPECT_EQ(places.size(), 100U);
    EXPECT_TRUE(std::is_sorted(places.begin(), places.end()));
    EXPECT_EQ(threads.size(), 1U);
}

TEST(DeadlineRunnerWithMany, NoneIsDoneAtOnce) {
    DeadlineRunner runner(kLong);
    EXPECT_TRUE(runner.runAll({}, [](std::size_t) { FAIL(); }).empty());
}

TEST(DeadlineRunnerWithMany, TheOthersAreAskedWhenOneHangs) {
    Stuck stuck;
    DeadlineRunner runner(kLimit);
    const auto asked = std::make_shared<std::array<std::atomic<int>, 5>>();
    const auto work = [asked, hang = stuck.work()](std::size_t place) {
        ++(*asked)[place];
        if (place == 2) {
            hang();
        }
    };
    EXPECT_EQ(runner.runAll(devices(5), work), (std::vector<bool>{true, true, false, true, true}));
    stuck.release();
    EXPECT_TRUE(eventually([&] { return stuck.inside() == 0; }));
    std::this_thread::sleep_for(milliseconds(2));
    for (const std::atomic<int>& count : *asked) {
        EXPECT_EQ(count, 1) << "what hung must not ask the rest once more";
    }
}

TEST(DeadlineRunnerWithMany, EachHasTheWholeLimit) {
    DeadlineRunner runner(3 * kLimit);
    const auto slow = [](std::size_t) { std::this_thread::sleep_for(kLimit); };
    EXPECT_EQ(runner.runAll(devices(6), slow), std::vector<bool>(6, true));
}

TEST(DeadlineRunnerWithMany, ABusThatIsDeadCostsLittleMoreThanTwiceTheLimit) {
    Stuck stuck;
    DeadlineRunner runner(kLimit);
    const auto time = lasted([&] {
        const auto work = [hang = stuck.work()](std::size_t) { hang(); };
        EXPECT_EQ(runner.runAll(devices(12), work), std::vector<bool>(12, false));
    });
    EXPECT_LT(time, 12 * kLimit / 2);
}

TEST(DeadlineRunnerWithMany, ThingsOfOneDeviceThatHangsAreNotWaitedFor) {
    Stuck stuck;
    DeadlineRunner runner(kLimit);
    const auto time = lasted([&] {
        const auto work = [hang = stuck.work()](std::size_t) { hang(); };
        EXPECT_EQ(runner.runAll(std::vector<std::string>(200, "chip"), work), std::vector<bool>(200, false));
    });
    EXPECT_LT(time, 4 * kLimit);
}

TEST(DeadlineRunnerWithMany, OneThatIsAskedByAnotherIsWaitedFor) {
    DeadlineRunner runner(kLong);
    std::atomic<bool> inside = false;
    std::thread other([&] {
        runner.run("device1", [&] {
            inside = true;
            std::this_thread::sleep_for(milliseconds(30));
        });
    });
    ASSERT_TRUE(eventually([&] { return inside.load(); }));
    EXPECT_EQ(runner.runAll(devices(3), [](std::size_t) {}), std::vector<bool>(3, true));
    other.join();
}

}  // namespace
