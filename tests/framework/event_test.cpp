#include "framework/qx/event.h"

#include <gmock/gmock.h>

#include <atomic>
#include <chrono>
#include <limits>
#include <thread>

#include "framework/qx/mutex.h"
#include "framework/qx/thread.h"
#include "tests/support/waits.h"

namespace {

using namespace std::chrono_literals;
using Clock = std::chrono::steady_clock;

/// The clock runs faster while it stands.
class FastClock {
public:
    explicit FastClock(double factor) { QX::setClockSpeed(factor); }
    ~FastClock() { QX::setClockSpeed(1); }
};

TEST(Event, ASignalBeforeTheWaitIsNotLost) {
    QX::Event event(true);
    event.signal();
    EXPECT_TRUE(event.wait(60));
}

TEST(Event, OneThatResetsItselfReleasesOneWait) {
    QX::Event event(true);
    event.signal();
    event.signal();
    EXPECT_TRUE(event.wait(0));
    EXPECT_FALSE(event.wait(0));
}

TEST(Event, OneThatDoesNotStaysSignalled) {
    QX::Event event(false);
    EXPECT_FALSE(event.wait(0));
    event.signal();
    EXPECT_TRUE(event.wait(0));
    EXPECT_TRUE(event.wait(0));
}

TEST(Event, TheTimeoutIsInSeconds) {
    QX::Event event(true);
    const auto start = Clock::now();
    EXPECT_FALSE(event.wait(1));
    EXPECT_GE(Clock::now() - start, 999ms);
}

TEST(Event, TheTimeoutFollowsTheClockSpeed) {
    const FastClock fast(1000);
    QX::Event event(true);
    const auto start = Clock::now();
    EXPECT_FALSE(event.wait(30));
    EXPECT_GE(Clock::now() - start, 29ms);
    EXPECT_LT(Clock::now() - start, 10s);
}

TEST(Event, ASignalWakesAWaiter) {
    QX::Event event(true);
    std::thread signaller([&] {
        std::this_thread::sleep_for(20ms);
        event.signal();
    });
    EXPECT_TRUE(event.wait(std::numeric_limits<unsigned long>::max()));
    signaller.join();
}

TEST(Event, EverySignalReleasesSomebody) {
    QX::Event event(true);
    std::atomic<int> released = 0;
    std::vector<std::thread> waiters;
    for (int count = 0; count < 4; ++count) {
        waiters.emplace_back([&] {
            if (event.wait(60)) {
                ++released;
            }
        });
    }
    for (int count = 1; count <= 4; ++count) {
        event.signal();
        while (released < count) {
            std::this_thread::yield();
        }
    }
    for (std::thread& waiter : waiters) {
        waiter.join();
    }
    EXPECT_FALSE(event.wait(0));
}

TEST(Event, MayBeDestroyedAsSoonAsItsSignalWasSeen) {
    for (int round = 0; round < 200; ++round) {
        auto event = std::make_unique<QX::Event>(true);
        std::thread signaller([raw = event.get()] { raw->signal(); });
        EXPECT_TRUE(event->wait(60));
        event.reset();
        signaller.join();
    }
}

TEST(Mutex, ASecondLockTimesOut) {
    QX::Mutex mutex;
    EXPECT_TRUE(mutex.lock(0));
    std::thread other([&] {
        const auto start = Clock::now();
        EXPECT_FALSE(mutex.lock(0));
        EXPECT_FALSE(mutex.lock(30));
        EXPECT_GE(Clock::now() - start, 29ms);
    });
    other.join();
    mutex.unlock();
    EXPECT_TRUE(mutex.lock(0));
    mutex.unlock();
}

TEST(Mutex, AllOnesWaitsUntilItIsFree) {
    QX::Mutex mutex;
    EXPECT_TRUE(mutex.lock(std::numeric_limits<unsigned long>::max()));
    std::atomic<bool> locked = false;
    std::thread other([&] {
        EXPECT_TRUE(mutex.lock(std::numeric_limits<unsigned long>::max()));
        locked = true;
        mutex.unlock();
    });
    std::this_thread::sleep_for(20ms);
    EXPECT_FALSE(locked);
    mutex.unlock();
    other.join();
    EXPECT_TRUE(locked);
}

TEST(Mutex, AGreatTimeoutDoesNotOverflow) {
    QX::Mutex mutex;
    EXPECT_TRUE(mutex.lock(std::numeric_limits<unsigned long>::max() - 1));
    std::thread other([&] { EXPECT_TRUE(mutex.lock(std::numeric_limits<unsigned long>::max() - 1)); });
    std::this_thread::sleep_for(5ms);
    mutex.unlock();
    other.join();
    mutex.unlock();
}

TEST(Mutex, KeepsThreadsApart) {
    QX::Mutex mutex;
    long counter = 0;
    std::vector<std::thread> threads;
    for (int count = 0; count < 4; ++count) {
        threads.emplace_back([&] {
            for (int round = 0; round < 1000; ++round) {
                ASSERT_TRUE(mutex.lock(60'000));
                ++counter;
                mutex.unlock();
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(counter, 4000);
}

TEST(WaitWitness, HearsOfEveryWaitAndHoldsItsThreadBack) {
    Waits waits;
    QX::Event never(true);
    never.wait(0);
    QX::Thread::sleep(5);
    QX::Thread().joinWithin(7);
    EXPECT_THAT(waits.ours(), testing::ElementsAre(0, 0.005, 0.007));
    waits.holdFrom(2);
    std::atomic<bool> slept{false};
    std::thread other([&] {
        QX::Thread::sleep(1);
        QX::Thread::sleep(2);
        slept = true;
    });
    EXPECT_TRUE(waits.othersBegin(2));
    EXPECT_FALSE(slept);
    waits.letGo();
    other.join();
    EXPECT_THAT(waits.others(), testing::ElementsAre(0.001, 0.002));
}

}  // namespace
