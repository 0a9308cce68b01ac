// Events are kept before anybody hears of them.
#include <gmock/gmock.h>

#include <atomic>
#include <future>
#include <thread>

#include "agent/core/event_keeping.h"
#include "tests/history/kept.h"

namespace {

using cvagent::Event;
using cvagent::EventKeeping;
using cvagent::EventLog;
using testing::ElementsAre;

/// Gives numbers from 100; holds everything up while it is told to.
class SlowKeeper : public cvagent::EventKeeper {
public:
    void keep(std::vector<Event>& events) noexcept override {
        arrived.set_value();
        held.get_future().wait();
        arrived = {};
        held = {};
        held.set_value();
        for (Event& event : events) {
            event.number = ++number;
        }
    }
    void settle() noexcept override { settled = number; }

    std::uint64_t number = 99;
    std::atomic<std::uint64_t> settled{0};
    std::promise<void> arrived;
    std::promise<void> held;
};

std::vector<std::uint64_t> numbersTold(EventLog& log) {
    std::vector<std::uint64_t> all;
    for (const Event& event : log.subscribe(0)->take().events) {
        all.push_back(event.number);
    }
    return all;
}

TEST(EventKeeping, AnAlertIsToldWhenItIsKeptAndOthersHoldNobodyUp) {
    EventLog log;
    const auto keeper = std::make_shared<SlowKeeper>();
    std::optional<EventKeeping> keeping(std::in_place, log, keeper);
    keeping->hear(kept::event("held", Event::Kind::published));
    keeper->arrived.get_future().wait();
    keeping->hear(kept::event("waits", Event::Kind::published));
    std::atomic<bool> over{false};
    std::jthread plugin([&] {
        keeping->hear(kept::alert("NIC is Offline "));
        over = true;
        EXPECT_THAT(numbersTold(log), ElementsAre(100, 101, 102));
    });
    EXPECT_THAT(numbersTold(log), ElementsAre());
    EXPECT_FALSE(over);
    keeper->held.set_value();
    plugin.join();
    keeping.reset();
    EXPECT_EQ(keeper->settled, 102U) << "the plug-ins have ended";
}

TEST(EventKeeping, TellsEverythingThatManyThreadsBring) {
    class Counter : public cvagent::EventKeeper {
    public:
        void keep(std::vector<Event>& events) noexcept override {
            for (Event& event : events) {
                event.number = ++number;
            }
        }
        void settle() noexcept override {}
        std::uint64_t number = 0;
    };
    EventLog log(EventLog::kMost);
    {
        EventKeeping keeping(log, std::make_shared<Counter>());
        std::vector<std::jthread> plugins;
        for (int i = 0; i < 4; ++i) {
            plugins.emplace_back([&keeping, i] {
                for (int event = 0; event < 500; ++event) {
                    keeping.hear(i == 0 ? kept::alert("a") : kept::event("x", Event::Kind::changed));
                }
            });
        }
    }
    const auto numbers = numbersTold(log);
    ASSERT_EQ(numbers.size(), 2000U);
    EXPECT_TRUE(std::ranges::is_sorted(numbers));
    EXPECT_EQ(numbers.back(), 2000U);
}

TEST(EventLog, KeepsTheNumbersOfEventsThatHaveOne) {
    EventLog log(2, 50);
    EXPECT_EQ(log.subscribe(40)->take().dropped, 10U) << "those before the start";
    EXPECT_EQ(log.subscribe(50)->take().dropped, 0U);
    Event event = kept::event("x");
    event.number = 60;
    log.hear(event);
    event.number = 0;
    log.hear(event);
    event.number = 55;  // told once more
    log.hear(event);
    event.number = 0;
    log.hear(event);
    const auto taken = log.subscribe(0)->take();
    std::vector<std::uint64_t> numbers;
    for (const Event& each : taken.events) {
        numbers.push_back(each.number);
    }
    EXPECT_THAT(numbers, ElementsAre(55, 62));
}

}  // namespace
