#include "tests/support/log_capture.h"
#include "tests/support/texts_are.h"

#include <gmock/gmock.h>

namespace {

const std::string component = "Corvista.Test";

void toLog(const std::string& message, int level = 3000) {
    CVLog::CVLogger::logLevelMessage("f", "source", 7, component, level, nullptr, 0, 0, message);
}

void toTrace(const std::string& message, int level = 3000) {
    CVLog::CVLogger::traceLevelMessage("f", "source", 7, component, level, nullptr, 0, 0, message);
}

TEST(LogCapture, KeepsAllArguments) {
    LogCapture capture;
    toLog("text", 6000);
    ASSERT_EQ(capture.lines().size(), 1U);
    const LogLine line = capture.lines().front();
    EXPECT_EQ(line.channel, LogLine::Channel::log);
    EXPECT_EQ(line.function, "f");
    EXPECT_EQ(line.source, "source");
    EXPECT_EQ(line.line, 7);
    EXPECT_EQ(line.component, component);
    EXPECT_EQ(line.level, 6000);
    EXPECT_TRUE(line.reserved1Null);
    EXPECT_EQ(line.reserved2, 0);
    EXPECT_EQ(line.reserved3, 0);
    EXPECT_EQ(line.message, "text");
    EXPECT_EQ(line.thread, std::this_thread::get_id());
}

TEST(LogCapture, TellsTheMessagesOfTheLog) {
    LogCapture capture;
    toLog("one");
    toTrace("one");
    toLog("two", 6000);
    toTrace("two", 6000);
    EXPECT_THAT(capture.messages(), TextsAre("one", "two"));
    EXPECT_THAT(capture.messages(6000), TextsAre("two"));
    EXPECT_TRUE(capture.everyLineTwice());
    capture.clear();
    EXPECT_TRUE(capture.messages().empty());
}

TEST(LogCapture, NoticesALineThatIsNotTwice) {
    auto twice = [](auto... calls) {
        LogCapture capture;
        (calls(), ...);
        return static_cast<bool>(capture.everyLineTwice());
    };
    auto log = [] { toLog("a"); };
    auto trace = [] { toTrace("a"); };
    EXPECT_TRUE(twice(log, trace, log, trace));
    EXPECT_FALSE(twice(log));
    EXPECT_FALSE(twice(trace));
    EXPECT_FALSE(twice(trace, log));
    EXPECT_FALSE(twice(log, log, trace, trace));
    EXPECT_FALSE(twice(log, trace, trace));
    EXPECT_FALSE(twice(log, [] { toTrace("a", 6000); }));
    EXPECT_FALSE(twice(log, [] { toTrace("b"); }));
}

TEST(LogCapture, PairsLinesWithinEachThread) {
    LogCapture capture;
    std::vector<std::thread> threads;
    for (int i = 0; i < 4; ++i)
        threads.emplace_back([i] {
            for (int round = 0; round < 200; ++round) {
                toLog(std::to_string(i));
                toTrace(std::to_string(i));
            }
        });
    for (std::thread& thread : threads) thread.join();
    EXPECT_EQ(capture.messages().size(), 800U);
    EXPECT_TRUE(capture.everyLineTwice());
}

}  // namespace
