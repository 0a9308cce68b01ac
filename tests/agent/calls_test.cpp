// What becomes of reads and writes that are late, fail or outlive whoever asked.
#include <gmock/gmock.h>
#include <sys/resource.h>

#include <atomic>
#include <latch>

#include "agent/cli/event_program.h"
#include "agent/core/agent.h"
#include "agent/core/announcer.h"
#include "framework/cvlog/logger.h"

namespace {

using namespace std::chrono_literals;
using cvagent::ErrorLines;
using cvagent::ErrorScope;
using cvagent::EventLog;
using cvagent::Facts;
using cvagent::Handle;
using cvagent::Pool;
using cvagent::Problem;
using testing::ElementsAre;
using testing::IsEmpty;

/// What a writer needs, with one thread.
struct WriterParts {
    cvagent::WriteResult write(const Handle& node, const std::string& text,
                               std::chrono::milliseconds longest) {
        return writer.write(node, *cvagent::findProperty(40, 115), IC::PropertyValue(text, true),
                            cvagent::Request("test", cvagent::Request::Clock::now() + longest));
    }

    Facts facts;
    EventLog events;
    cvagent::Announcer announcer{events, facts};
    int refreshed = 0;
    bool listed = true;
    Pool pool{1, 1};
    cvagent::Writer writer{
        pool, facts, announcer, {[this] { ++refreshed; }, [this](const Handle&) { return listed; }}};
};

TEST(Writer, AWriteThatHasNotBegunAtItsDeadlineNeverDoes) {
    const auto node = std::make_shared<IC::MutableNode>(7, 0, std::vector<unsigned int>{1}, 40, 0);
    node->setProperty(115, IC::PropertyValue("old", true));
    WriterParts parts;
    std::latch free(1);
    parts.pool.submit(9, nullptr, [&free] { free.wait(); });
    const auto late = parts.write(node, "late", 20ms);
    free.count_down();
    ASSERT_TRUE(late.problem);
    EXPECT_EQ(late.problem->kind(), Problem::timedOut);
    EXPECT_STREQ(late.problem->what(), "OwnerContact was not changed: no answer in time");
    EXPECT_TRUE(parts.pool.settle(5s));
    EXPECT_EQ(static_cast<std::string>(cvagent::readProperty(*node, 115).value), "old");
    EXPECT_EQ(parts.write(node, "next", 5s).outcome, cvagent::WriteResult::applied);
}

TEST(Writer, ANodeThatIsGoneIsNotWrittenTo) {
    const auto node = std::make_shared<IC::MutableNode>(7, 0, std::vector<unsigned int>{1}, 40, 0);
    node->setProperty(115, IC::PropertyValue("old", true));
    WriterParts parts;
    parts.listed = false;
    const auto result = parts.write(node, "new", 5s);
    ASSERT_TRUE(result.problem);
    EXPECT_EQ(result.problem->kind(), Problem::notFound);
    EXPECT_STREQ(result.problem->what(), "OwnerContact was not changed: the node is gone");
    EXPECT_TRUE(result.after.failed());
    EXPECT_TRUE(parts.events.subscribe(0)->take().events.empty());
    EXPECT_EQ(static_cast<std::string>(cvagent::readProperty(*node, 115).value), "old");
}

/// Refuses to be written.
class ReadOnlyNode : public IC::MutableNode {
public:
    using MutableNode::MutableNode;
    IC::Error setProperty(const unsigned int& /*id*/, const IC::PropertyValue& /*value*/) override {
        return {IC::Error::failure, IC::Number(), "no"};
    }
};

TEST(Writer, OneThatFailsHasReadNothingAfterwardsAndLooksForNewNodes) {
    const auto node = std::make_shared<ReadOnlyNode>(7, 0, std::vector<unsigned int>{1}, 40, 0);
    WriterParts parts;
    const auto result = parts.write(node, "new", 5s);
    ASSERT_TRUE(result.problem);
    EXPECT_EQ(result.problem->kind(), Problem::failed);
    EXPECT_TRUE(result.after.failed());
    EXPECT_EQ(result.after.name(), "OwnerContact");
    EXPECT_EQ(parts.refreshed, 1);
}

/// Answers when it may.
class WaitingNode : public IC::MutableNode {
public:
    WaitingNode(std::latch& may, std::atomic<bool>& asked)
        : MutableNode(7, 0, {1}, 40, 0), may_(may), asked_(asked) {}
    IC::Error getProperty(unsigned int /*id*/, IC::PropertyValue& /*out*/) const override {
        asked_ = true;
        may_.wait();
        return {};
    }

private:
    std::latch& may_;
    std::atomic<bool>& asked_;
};

TEST(Reader, WhatEndsWithTheNodeIsNotTheRequests) {
    Facts facts;
    Pool pool;
    cvagent::Reader reader(pool, facts);
    std::latch may(1);
    ErrorLines nobodys;
    std::atomic<ErrorLines*> owner{&nobodys};
    std::atomic<bool> asked{false};
    Handle node(new WaitingNode(may, asked), [&owner](IC::MutableNode* last) {
        owner = ErrorScope::owner();
        delete last;
    });
    while (!asked) {
        reader.read(node, {5}, cvagent::Freshness::now,
                    cvagent::Request("test", cvagent::Request::Clock::now() + 5ms));
    }
    node.reset();
    may.count_down();
    EXPECT_TRUE(pool.settle(5s));
    EXPECT_EQ(owner, nullptr);
}

// UndefinedBehaviorSanitizer looks at an object through a pipe.
#if !defined(__SANITIZE_ADDRESS__)
/// What the work complains of while no descriptor is to be had.
template <class Work>
std::string withoutDescriptors(const Work& work) {
    rlimit usual{};
    getrlimit(RLIMIT_NOFILE, &usual);
    const rlimit none{0, usual.rlim_max};
    setrlimit(RLIMIT_NOFILE, &none);
    std::string told;
    try {
        work();
    } catch (const std::exception& exception) {
        told = exception.what();
    }
    setrlimit(RLIMIT_NOFILE, &usual);
    return told;
}

TEST(EventLog, WhoCouldNotBeWokenDoesNotSubscribe) {
    EventLog log;
    EXPECT_EQ(withoutDescriptors([&log] { log.subscribe(0); }),
              "cannot wait for events: Too many open files");
    const auto events = log.subscribe(0);
    EXPECT_EQ(withoutDescriptors([&events] { cvagent::EventProgram("/bin/true", 1s, events); }),
              "cannot wait for events: Too many open files");
}
#endif

TEST(LogOutput, AnEarlierOneThatGoesLeavesTheLatestItsLines) {
    const auto first = std::make_shared<ErrorLines>();
    const auto second = std::make_shared<ErrorLines>();
    auto early = std::make_unique<cvagent::LogOutput>(cvagent::LogSettings(), first);
    auto late = std::make_unique<cvagent::LogOutput>(cvagent::LogSettings(), second);
    early.reset();
    CVLog::CVLogger::logLevelMessage("here", "", 0, "", 6000, nullptr, 0, 0, "heard");
    EXPECT_THAT(second->take().texts, ElementsAre("heard [here]"));
    EXPECT_THAT(first->take().texts, IsEmpty());
}

}  // namespace
