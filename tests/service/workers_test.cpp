#include <gmock/gmock.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <limits>
#include <mutex>
#include <optional>
#include <thread>

#include "agent/service/loop.h"
#include "agent/service/workers.h"
#include "tests/support/waiting.h"

namespace {

using cvagent::service::Loop;
using cvagent::service::Workers;
using testing::ElementsAre;

TEST(ServiceWorkers, ServeEachUserInTurn) {
    std::mutex hold;
    std::atomic<bool> entered{false};
    std::vector<int> done;
    std::atomic<int> count{0};
    Workers workers({1, 10, 20});
    hold.lock();
    ASSERT_TRUE(workers.submit(0, [&] {
        entered = true;
        const std::lock_guard lock(hold);
    }));
    ASSERT_TRUE(eventually([&] { return entered.load(); }));
    for (const int job : {11, 12, 13, 21, 31, 14}) {
        ASSERT_TRUE(workers.submit(static_cast<std::uint32_t>(job / 10), [&, job] {
            done.push_back(job);
            ++count;
        }));
    }
    hold.unlock();
    ASSERT_TRUE(eventually([&] { return count == 6; }));
    EXPECT_THAT(done, ElementsAre(11, 21, 31, 12, 13, 14));
}

TEST(ServiceWorkers, RefuseWhatIsTooMuch) {
    std::mutex hold;
    hold.lock();
    std::atomic<bool> entered{false};
    Workers workers({1, 2, 3});
    ASSERT_TRUE(workers.submit(7, [&] {
        entered = true;
        const std::lock_guard lock(hold);
    }));
    ASSERT_TRUE(eventually([&] { return entered.load(); }));
    const auto nothing = [] {};
    EXPECT_TRUE(workers.submit(7, nothing));
    EXPECT_TRUE(workers.submit(7, nothing));
    EXPECT_FALSE(workers.submit(7, nothing)) << "enough of this user's";
    EXPECT_TRUE(workers.submit(8, nothing));
    EXPECT_FALSE(workers.submit(9, nothing)) << "enough of all users'";
    EXPECT_TRUE(workers.isBusy());
    hold.unlock();
    EXPECT_TRUE(eventually([&] { return !workers.isBusy(); }));
    EXPECT_TRUE(workers.submit(9, nothing));
}

TEST(ServiceWorkers, EndWhenThereIsNothingToDo) {
    std::atomic<int> done{0};
    Workers workers({4, 100, 100, std::chrono::milliseconds(1)});
    for (int round = 1; round <= 20; ++round) {
        for (int job = 0; job < 5; ++job) {
            ASSERT_TRUE(workers.submit(7, [&done] { ++done; }));
        }
        ASSERT_TRUE(eventually([&] { return done == 5 * round && workers.threads() == 0; }));
    }
}

TEST(ServiceWorkers, DropAtTheirEndWhatHasNotBegun) {
    std::atomic<int> done{0};
    std::mutex hold;
    hold.lock();
    std::atomic<bool> entered{false};
    {
        Workers workers({1, 10, 10});
        workers.submit(1, [&] {
            entered = true;
            const std::lock_guard lock(hold);
            ++done;
        });
        ASSERT_TRUE(eventually([&] { return entered.load(); }));
        workers.submit(1, [&] { done += 100; });
        workers.stop();
        EXPECT_FALSE(workers.submit(1, [] {}));
        hold.unlock();
    }
    EXPECT_EQ(done, 1);
}

/// What the library of the bus counts without a lock ends where it is used.
TEST(ServiceLoop, WhatIsHeldForItEndsOnItsThread) {
    Loop loop;
    std::optional<std::thread::id> ended;
    const auto made = [&] {
        return heldForLoop(loop.mailbox(), std::shared_ptr<int>(new int(7), [&ended](const int* last) {
                               delete last;
                               ended = std::this_thread::get_id();
                           }));
    };
    made().reset();
    EXPECT_EQ(ended, std::this_thread::get_id());
    ended.reset();
    std::thread([held = made()]() mutable { held.reset(); }).join();
    EXPECT_FALSE(ended);
    loop.mailbox()->post([&loop] { loop.stop(); });
    loop.run();
    EXPECT_EQ(ended, std::this_thread::get_id());
}

/// The library's own idea of a time is the next quarter of a second; the first one may be near.
TEST(ServiceLoop, IsHardlyLate) {
    Loop loop;
    std::chrono::nanoseconds shortest = std::chrono::hours(1);
    for (int round = 0; round < 20; ++round) {
        const auto begun = std::chrono::steady_clock::now();
        const auto stop = loop.after(std::chrono::milliseconds(8), [] {});
        sd_event_run(loop.get(), std::numeric_limits<std::uint64_t>::max());
        const auto taken = std::chrono::steady_clock::now() - begun;
        shortest = round == 0 ? shortest : std::min<std::chrono::nanoseconds>(shortest, taken);
    }
    EXPECT_LT(shortest, std::chrono::milliseconds(60));
}

}  // namespace
