// What a thread may still do that is being stopped, and what becomes of it.
#include "mi/stopped_thread.h"

#include <gmock/gmock.h>

#include <atomic>
#include <chrono>
#include <functional>
#include <memory>
#include <thread>

#include "mi/command.h"
#include "mi/log.h"
#include "mi/my_process.h"
#include "tests/support/command_lines.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/waiting.h"
#include "tests/support/waits.h"

namespace {

using namespace std::chrono_literals;
using IC::MyProcess;

class Errand : public QX::Thread {
public:
    explicit Errand(std::function<void()> work) : work_(std::move(work)) {}
    ~Errand() override { join(); }
    void* run(void* /*argument*/) override {
        work_();
        return nullptr;
    }

private:
    std::function<void()> work_;
};

HOST_TEST(AbortedThread, StartsNoFurtherCommand) {
    const CommandLines commands;
    const int before = MyProcess::cnt;
    Errand errand([&] {
        QX::Thread::sleep(60'000);
        const unsigned int cutOff = IC::commandsCutOff();
        {
            MyProcess process;
            EXPECT_EQ(process.mypopen("true", "r"), nullptr);
            MyProcess other;
            EXPECT_EQ(other.mypopen(std::string("true"), "r"), nullptr);
        }
        EXPECT_EQ(IC::commandsCutOff(), cutOff + 2) << "they have not told what they had to";
        IC::runToEnd("true");
    });
    errand.start(nullptr);
    errand.abort();
    errand.join();
    EXPECT_THAT(commands.all(), testing::IsEmpty());
    EXPECT_EQ(MyProcess::cnt, before + 2) << "as of commands that could not be started";
}

HOST_TEST(AbortedThread, HasNoErrorsOfItsOwn) {
    LogCapture capture;
    std::atomic<bool> begun{false};
    Errand errand([&] {
        IC::log(IC::kError) << "before";
        begun = true;
        QX::Thread::sleep(60'000);
        IC::log(IC::kError) << "not for want of a tool";
        IC::log(IC::kProgress) << "after";
    });
    errand.start(nullptr);
    ASSERT_TRUE(eventually([&] { return begun.load(); }));
    errand.abort();
    errand.join();
    EXPECT_THAT(capture.messages(), TextsAre("before", "after"));
}

HOST_TEST(JoinWithPatience, EndsTheCommandsAfterTenSeconds) {
    host.tool("ethtool eth0", ToolAnswer{.out = "", .delayMilliseconds = 60'000});
    Errand errand([] { IC::HostCommand("ethtool eth0").nextLine(); });
    errand.start(nullptr);
    QX::setClockSpeed(1000);
    const Waits waits;
    IC::joinWithPatience(errand);
    EXPECT_THAT(waits.ours(), testing::ElementsAre(10));
    EXPECT_TRUE(errand.joinWithin(0));
}

HOST_TEST(DropStopped, DeletesAThreadThatHasEndedAtOnce) {
    auto held = std::make_shared<int>();
    const std::weak_ptr<int> thing = held;
    auto errand = std::make_unique<Errand>([held = std::move(held)] {});
    errand->start(nullptr);
    errand->join();
    IC::dropStopped(std::move(errand));
    EXPECT_TRUE(thing.expired());
}

HOST_TEST(DropStopped, WaitsWhereTheLibraryIsBeingClosed) {
    std::atomic<bool> ended{false};
    auto errand = std::make_unique<Errand>([&] {
        std::this_thread::sleep_for(50ms);
        ended = true;
    });
    errand->start(nullptr);
    IC::leaveNoThreads();
    IC::dropStopped(std::move(errand));
    EXPECT_TRUE(ended);
}

}  // namespace
