#include "framework/qx/thread.h"

#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <atomic>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <fstream>
#include <functional>
#include <memory>
#include <thread>

#include "framework/cvlog/logger.h"
#include "framework/qx/event.h"
#include "framework/qx/process_tree.h"
#include "tests/support/failing_new.h"
#include "tests/support/no_child_lists.h"
#include "tests/support/no_threads.h"

namespace {

using namespace std::chrono_literals;
using Clock = std::chrono::steady_clock;

constexpr unsigned int kLong = 600'000;  // milliseconds; a test that sleeps them out has failed

class Worker : public QX::Thread {
public:
    explicit Worker(std::function<void*(void*)> work) : work_(std::move(work)) {}
    explicit Worker(const std::function<void()>& work)
        : work_([work](void* /*argument*/) -> void* {
              work();
              return nullptr;
          }) {}
    ~Worker() override { join(); }
    void* run(void* argument) override { return work_(argument); }

private:
    std::function<void*(void*)> work_;
};

/// Waits for a condition that must come true soon.
bool soon(const std::function<bool()>& holds) {
    for (const auto end = Clock::now() + 20s; Clock::now() < end; std::this_thread::sleep_for(2ms)) {
        if (holds()) {
            return true;
        }
    }
    return false;
}

/// Whether a process runs: one that only waits to be collected does not.
bool isRunning(pid_t process) {
    std::ifstream in("/proc/" + std::to_string(process) + "/stat");
    std::string line;
    std::getline(in, line);
    const auto name = line.rfind(')');
    return name != std::string::npos && line.at(name + 2) != 'Z' && line.at(name + 2) != 'X';
}

/// Runs a command, reads it to its end and keeps the lines where the test can see them.
class Reader {
public:
    void read(const char* command) {
        FILE* const pipe = popen(command, "r");
        ASSERT_NE(pipe, nullptr);
        std::array<char, 512> line{};
        while (fgets(line.data(), line.size(), pipe) != nullptr) {
            lines_[count_] = std::stoi(line.data());
            ++count_;
        }
        pclose(pipe);
    }
    int count() const { return count_; }
    int line(int index) const { return lines_.at(static_cast<std::size_t>(index)); }

private:
    std::array<std::atomic<int>, 16> lines_{};
    std::atomic<int> count_ = 0;
};

TEST(Thread, RunsWithItsArgument) {
    int value = 0;
    Worker worker([](void* argument) -> void* {
        *static_cast<int*>(argument) = 42;
        return nullptr;
    });
    EXPECT_TRUE(worker.start(&value));
    worker.join();
    EXPECT_EQ(value, 42);
}

TEST(Thread, TheBaseRunsNothing) {
    QX::Thread thread;
    thread.stop();
    EXPECT_TRUE(thread.start(nullptr));
    thread.join();
}

TEST(Thread, ThatNeverRanCanBeJoinedAndAborted) {
    QX::Thread thread;
    thread.join();
    thread.abort();
    thread.join();
}

TEST(Thread, StartsAgainOnceItHasEnded) {
    std::atomic<int> runs = 0;
    Worker worker([&] {
        ++runs;
        QX::Thread::sleep(kLong);
    });
    EXPECT_TRUE(worker.start(nullptr));
    EXPECT_FALSE(worker.start(nullptr));
    worker.join();
    EXPECT_TRUE(worker.start(nullptr));
    worker.abort();
    worker.join();
    worker.join();
    EXPECT_EQ(runs, 2);
}

TEST(Thread, ANewRunSleepsAgain) {
    std::atomic<bool> slept = false;
    Worker worker([&] {
        const auto start = Clock::now();
        QX::Thread::sleep(50);
        slept = Clock::now() - start >= 49ms;
    });
    worker.start(nullptr);
    worker.abort();
    worker.join();
    slept = false;
    worker.start(nullptr);
    EXPECT_TRUE(soon([&] { return slept.load(); }));
    worker.join();
}

TEST(Thread, StartsAgainWithoutAJoin) {
    std::atomic<int> runs = 0;
    Worker worker([&] { ++runs; });
    worker.start(nullptr);
    EXPECT_TRUE(soon([&] { return worker.start(nullptr); }));
    worker.join();
    EXPECT_EQ(runs, 2);
}

TEST(Thread, CanBeJoinedByManyAtOnce) {
    std::atomic<bool> finished = false;
    Worker worker([&] {
        std::this_thread::sleep_for(30ms);
        finished = true;
    });
    worker.start(nullptr);
    std::vector<std::thread> joiners;
    for (int count = 0; count < 4; ++count) {
        joiners.emplace_back([&] {
            worker.join();
            EXPECT_TRUE(finished);
        });
    }
    for (std::thread& joiner : joiners) {
        joiner.join();
    }
}

TEST(Thread, DestroyedWhileItRunsIsJoined) {
    std::atomic<bool> finished = false;
    {
        Worker worker([&] {
            QX::Thread::sleep(kLong);
            finished = true;
        });
        worker.start(nullptr);
    }
    EXPECT_TRUE(finished);
}

TEST(Thread, IsWaitedForNotLongerThanAsked) {
    std::atomic<bool> go = false;
    Worker worker([&] {
        QX::Thread::sleep(kLong);
        while (!go) {
            std::this_thread::sleep_for(1ms);
        }
    });
    EXPECT_TRUE(worker.joinWithin(0)) << "it does not run";
    worker.start(nullptr);
    const auto start = Clock::now();
    EXPECT_FALSE(worker.joinWithin(30));
    EXPECT_GE(Clock::now() - start, 29ms);
    go = true;
    EXPECT_TRUE(worker.joinWithin(kLong));
    EXPECT_LT(Clock::now() - start, 10s) << "its sleep has ended";
}

TEST(Thread, KnowsItself) {
    std::atomic<int> answers = 0;
    Worker worker([&] { answers = (worker.isThisThread() ? 1 : 0) + (worker.joinWithin(kLong) ? 0 : 2); });
    worker.start(nullptr);
    EXPECT_FALSE(worker.isThisThread());
    worker.join();
    EXPECT_EQ(answers, 3) << "and does not wait for itself";
}

/// A thread that waits for its test, with something that goes when it goes.
struct Left {
    std::shared_ptr<int> held = std::make_shared<int>();
    std::weak_ptr<int> thing = held;
    std::atomic<bool> runs = false;
    std::atomic<bool> go = false;
    std::atomic<bool> knew = false;
    std::unique_ptr<QX::Thread> thread = std::make_unique<Worker>([this, thing = std::move(held)] {
        runs = true;
        while (!go) {
            std::this_thread::sleep_for(1ms);
        }
        knew = QX::Thread::isLeft();
    });
};

TEST(Thread, ThatIsLeftOwnsItselfUntilItsEnd) {
    Left left;
    left.thread->start(nullptr);
    ASSERT_TRUE(soon([&] { return left.runs.load(); }));
    left.thread->abort();
    QX::Thread::leave(std::move(left.thread));
    EXPECT_FALSE(left.thing.expired());
    left.go = true;
    EXPECT_TRUE(soon([&] { return left.thing.expired(); }));
    EXPECT_TRUE(left.knew);
    EXPECT_FALSE(QX::Thread::isLeft());
}

TEST(Thread, ThatHasEndedGoesWhenItIsLeft) {
    Left left;
    left.go = true;
    left.thread->start(nullptr);
    left.thread->join();
    EXPECT_FALSE(left.knew);
    QX::Thread::leave(std::move(left.thread));
    EXPECT_TRUE(left.thing.expired());
}

TEST(Thread, MayDestroyItselfAtItsEnd) {
    class OwnEnd : public QX::Thread {
    public:
        explicit OwnEnd(std::atomic<bool>& gone) : gone_(gone) {}
        ~OwnEnd() override { gone_ = true; }
        void* run(void* /*argument*/) override {
            join();
            delete this;
            return nullptr;
        }

    private:
        std::atomic<bool>& gone_;
    };
    std::atomic<bool> gone = false;
    auto* const thread = new OwnEnd(gone);
    EXPECT_TRUE(thread->start(nullptr));
    EXPECT_TRUE(soon([&] { return gone.load(); }));
}

/// What a thread logs that ends by an exception.
void expectEndLogged(const std::function<void()>& work, const std::string& message) {
    class Sink : public CVLog::LogSink {
    public:
        void write(const CVLog::LogRecord& record) override {
            level = record.level;
            message = record.message;
        }
        int level = 0;
        std::string message;
    } sink;
    CVLog::CVLogger::setLog(&sink, 0);
    Worker worker(work);
    worker.start(nullptr);
    worker.join();
    CVLog::CVLogger::setLog(nullptr, 0);
    EXPECT_EQ(sink.level, 6000);
    EXPECT_EQ(sink.message, message);
}

TEST(Thread, AnExceptionEndsItAndIsLogged) {
    expectEndLogged([] { throw std::runtime_error("disk on fire"); },
                    "thread ended by an exception: disk on fire");
    expectEndLogged([] { throw 7; }, "thread ended by an exception: unknown");
}

TEST(Thread, StartTellsWhenTheSystemGivesNone) {
    // In a process of its own that may not have another thread. Root is not bound by the limit, so it steps
    // down.
    const auto startWithoutRoom = [] {
        const rlimit none{1, 1};
        if (setrlimit(RLIMIT_NPROC, &none) != 0 || (getuid() == 0 && setresuid(54321, 54321, 54321) != 0)) {
            _exit(2);
        }
        QX::Thread thread;
        const bool started = thread.start(nullptr);
        thread.join();
        _exit(started ? 1 : 0);
    };
    EXPECT_EXIT(startWithoutRoom(), testing::ExitedWithCode(0), "");
}

TEST(ThreadSleep, BlocksForMilliseconds) {
    const auto start = Clock::now();
    QX::Thread::sleep(30);
    EXPECT_GE(Clock::now() - start, 29ms);
    EXPECT_LT(Clock::now() - start, 10s);
}

TEST(ThreadSleep, FollowsTheClockSpeed) {
    QX::setClockSpeed(1000);
    const auto start = Clock::now();
    QX::Thread::sleep(kLong / 20);
    EXPECT_LT(Clock::now() - start, 10s);
    QX::setClockSpeed(0);  // no speed at all means real time
    QX::Thread::sleep(1);
    QX::setClockSpeed(1);
}

TEST(ThreadSleep, EndsWhenTheThreadIsJoined) {
    std::atomic<int> sleeps = 0;
    Worker worker([&] {
        for (; sleeps < 12; ++sleeps) {
            QX::Thread::sleep(kLong);
        }
    });
    worker.start(nullptr);
    std::this_thread::sleep_for(20ms);
    EXPECT_EQ(sleeps, 0);
    worker.join();
    EXPECT_EQ(sleeps, 12);
}

TEST(ThreadSleep, EndsWhenTheThreadIsAborted) {
    std::atomic<bool> finished = false;
    Worker worker([&] {
        QX::Thread::sleep(kLong);
        finished = true;
    });
    worker.start(nullptr);
    std::this_thread::sleep_for(20ms);
    worker.abort();
    EXPECT_TRUE(soon([&] { return finished.load(); }));
}

TEST(ThreadSleep, OfOthersGoesOn) {
    Worker other([] { QX::Thread::sleep(kLong); });
    other.start(nullptr);
    other.abort();
    other.join();
    const auto start = Clock::now();
    QX::Thread::sleep(30);
    EXPECT_GE(Clock::now() - start, 29ms);
}

TEST(ThreadAbort, EndsAWaitForAnEvent) {
    QX::Event event(true);
    std::atomic<int> answer = -1;
    Worker worker([&] { answer = event.wait(kLong) ? 1 : 0; });
    worker.start(nullptr);
    std::this_thread::sleep_for(20ms);
    worker.abort();
    worker.join();
    EXPECT_EQ(answer, 0);
    event.signal();
    EXPECT_TRUE(event.wait(0));  // others wait as ever
}

TEST(ThreadAbort, ThatFindsNoMemoryForItsSearchIsMadeUpForByTheJoin) {
    long allocations = 0;
    for (bool failed = true; failed; ++allocations) {
        Reader reader;
        Worker worker([&] { reader.read("echo 1; sleep 600"); });
        worker.start(nullptr);
        ASSERT_TRUE(soon([&] { return reader.count() == 1; }));
        {
            const FailingOnce once(allocations);
            EXPECT_NO_THROW(worker.abort()) << allocations;
            failed = once.happened();
        }
        const FailingOnce onceMore(0);
        EXPECT_NO_THROW(worker.join()) << allocations;
    }
    EXPECT_GT(allocations, 1);
}

TEST(ThreadAbort, RacesWithTheStartOfAWait) {
    for (int round = 0; round < 300; ++round) {
        QX::Event event(true);
        Worker worker([&] {
            event.wait(kLong);
            QX::Thread::sleep(kLong);
        });
        worker.start(nullptr);
        worker.abort();
        worker.join();
    }
}

/// A thread with a command is aborted, and of what has told its number nothing runs any more.
void expectKilled(const char* command, int processes) {
    Reader reader;
    Worker worker([&] { reader.read(command); });
    worker.start(nullptr);
    ASSERT_TRUE(soon([&] { return reader.count() == processes; }));
    worker.abort();
    worker.join();
    for (int index = 0; index < processes; ++index) {
        EXPECT_TRUE(soon([&] { return !isRunning(reader.line(index)); })) << index;
    }
}

// Every stage tells its process and holds the pipe open: the shell, a child of it, one of a subshell, one
// behind a pipe.
constexpr const char* kPipeline =
    "echo $$; sleep 1000 & echo $!; (sleep 1000 & echo $!; wait) & echo $!; "
    "sh -c 'echo $$; sleep 1000' | cat; wait";

TEST(ThreadAbort, KillsACommandAndEverythingItStarted) {
    expectKilled(kPipeline, 5);
}

/// A thread that starts commands which never end, one after the other, once it is told to.
struct Stubborn {
    explicit Stubborn(int count)
        : worker([this, count] {
              while (!go) {
                  std::this_thread::yield();
              }
              for (; ended < count; ++ended) {
                  reader.read("sleep 1000");
              }
          }) {
        worker.start(nullptr);
    }

    Reader reader;
    std::atomic<bool> go = false;
    std::atomic<int> ended = 0;  ///< commands
    Worker worker;
};

TEST(ThreadAbort, EndsCommandsThatAreStartedAfterIt) {
    Stubborn stubborn(3);
    stubborn.worker.abort();
    stubborn.go = true;
    stubborn.worker.join();
    EXPECT_EQ(stubborn.ended, 3);
}

TEST(ThreadAbort, IsRepeatedUntilTheThreadHasEndedThoughNobodyWaitsForIt) {
    Stubborn stubborn(2);
    stubborn.worker.abort();
    stubborn.worker.abort();
    stubborn.go = true;
    EXPECT_TRUE(soon([&] { return stubborn.ended == 2; }));
}

TEST(ThreadAbort, IsRepeatedByTheJoinWhereNoThreadIsLeftForIt) {
    Stubborn stubborn(1);
    {
        const NoThreads none;
        EXPECT_NO_THROW(stubborn.worker.abort());
    }
    stubborn.go = true;
    stubborn.worker.join();
    EXPECT_EQ(stubborn.ended, 1);
}

TEST(ThreadAbort, IsKnownInTheThreadAlone) {
    constexpr int kNone = -1;
    std::atomic<int> answers = kNone;
    Worker worker([&] {
        answers = QX::Thread::isAborted() ? 1 : 0;
        QX::Thread::sleep(kLong);
        answers += QX::Thread::isAborted() ? 4 : 2;
    });
    worker.start(nullptr);
    worker.join();
    EXPECT_EQ(answers, 2);
    answers = kNone;
    worker.start(nullptr);
    ASSERT_TRUE(soon([&] { return answers != kNone; }));
    worker.abort();
    EXPECT_FALSE(QX::Thread::isAborted());
    worker.join();
    EXPECT_EQ(answers, 4);
}

TEST(ThreadAbort, DuringAJoinStillKills) {
    Reader reader;
    Worker worker([&] { reader.read("echo $$; exec sleep 1000"); });
    worker.start(nullptr);
    std::thread joiner([&] { worker.join(); });
    ASSERT_TRUE(soon([&] { return reader.count() == 1; }));
    worker.abort();
    joiner.join();
    EXPECT_FALSE(isRunning(reader.line(0)));
}

TEST(ThreadAbort, LeavesTheCommandsOfOtherThreadsAlone) {
    Reader mine;
    Reader others;
    Worker victim([&] { mine.read("echo $$; exec sleep 1000"); });
    Worker bystander([&] { others.read("echo $$; exec sleep 1000"); });
    victim.start(nullptr);
    bystander.start(nullptr);
    ASSERT_TRUE(soon([&] { return mine.count() == 1 && others.count() == 1; }));
    victim.abort();
    victim.join();
    EXPECT_FALSE(isRunning(mine.line(0)));
    EXPECT_TRUE(isRunning(others.line(0)));
    bystander.abort();
    bystander.join();
    EXPECT_FALSE(isRunning(others.line(0)));
}

TEST(ThreadAbortWithoutChildLists, KillsACommandAndEverythingItStarted) {
    const NoChildLists none;
    expectKilled(kPipeline, 5);
}

TEST(ThreadAbortWithoutChildLists, KillsACommandThatWritesElsewhere) {
    const NoChildLists none;
    expectKilled("echo $$; exec > /dev/null; (sleep 1000); true", 1);
}

TEST(ThreadAbortWithoutChildLists, KillsWhatHoldsThePipeWhenTheShellHasGone) {
    const NoChildLists none;
    expectKilled("sleep 1000 & echo $!", 1);
}

TEST(ThreadAbortWithoutChildLists, LeavesTheCommandsOfOthersAlone) {
    const NoChildLists none;
    Reader mine;
    Reader others;
    Worker victim([&] { mine.read("echo $$; exec sleep 1000"); });
    Worker bystander([&] { others.read("echo $$; exec sleep 1000"); });
    victim.start(nullptr);
    ASSERT_TRUE(soon([&] { return mine.count() == 1; }));
    bystander.start(nullptr);
    const pid_t heir = fork();  // has what the victim reads from, as any program that is started meanwhile
    if (heir == 0) {
        execlp("sleep", "sleep", "1000", nullptr);
        _exit(127);
    }
    ASSERT_TRUE(soon([&] { return others.count() == 1; }));
    victim.abort();
    victim.join();
    EXPECT_FALSE(isRunning(mine.line(0)));
    EXPECT_TRUE(isRunning(others.line(0)));
    EXPECT_TRUE(isRunning(heir));
    kill(heir, SIGKILL);
    EXPECT_EQ(waitpid(heir, nullptr, 0), heir);
    bystander.abort();
}

TEST(ChildrenWithoutLists, AreWhatTheThreadWaitsFor) {
    const NoChildLists none;
    Reader reader;
    std::atomic<pid_t> thread = 0;
    Worker worker([&] {
        thread = gettid();
        reader.read("echo $$; exec sleep 1000");
    });
    worker.start(nullptr);
    ASSERT_TRUE(soon([&] { return reader.count() == 1 && QX::childrenOf(thread).size() == 1; }));
    const QX::ChildProcess child = QX::childrenOf(thread).at(0);
    EXPECT_EQ(child.id, reader.line(0));
    EXPECT_TRUE(QX::childrenOf(gettid()).empty());
    EXPECT_FALSE(QX::killChild(thread, {child.id, child.started + 1})) << "another process by that number";
    EXPECT_TRUE(QX::killChild(thread, child));
    worker.join();
    EXPECT_FALSE(isRunning(reader.line(0)));
}

}  // namespace
