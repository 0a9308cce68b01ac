// The wrapper around the bus: texts, messages.
#include <gmock/gmock.h>

#include "agent/bus/text.h"
#include "tests/service/service_run.h"

namespace {

namespace bus = cvagent::bus;
using namespace std::chrono_literals;

TEST(BusText, IsUtf8WithoutZeros) {
    for (const char* good : {"", "a", "\xC3\xA4", "\xE2\x82\xAC", "\xF0\x9F\x98\x80", "\n\x01"}) {
        EXPECT_TRUE(bus::isText(good)) << good;
        EXPECT_EQ(bus::asText(good), good);
    }
    using std::string;
    const std::pair<string, string> bad[] = {
        {string("a\0b", 3),
         "a\xEF\xBF\xBD"
         "b"},                                                       // a zero
        {"\xC3", "\xEF\xBF\xBD"},                                    // cut off
        {"\xC0\x80", "\xEF\xBF\xBD\xEF\xBF\xBD"},                    // too long for what it says
        {"\xED\xA0\x80x", "\xEF\xBF\xBD\xEF\xBF\xBD\xEF\xBF\xBDx"},  // half of a pair
        {"\xF4\x90\x80\x80",
         "\xEF\xBF\xBD\xEF\xBF\xBD\xEF\xBF\xBD\xEF\xBF\xBD"},      // behind the last character
        {"\xEF\xBF\xBF", "\xEF\xBF\xBD\xEF\xBF\xBD\xEF\xBF\xBD"},  // no character
        {"\xFF", "\xEF\xBF\xBD"},
    };
    for (const auto& [bytes, text] : bad) {
        EXPECT_FALSE(bus::isText(bytes)) << testing::PrintToString(bytes);
        EXPECT_EQ(bus::asText(bytes), text);
    }
}

/// Two connections to a bus of the test's own, one of which serves.
HOST_TEST(BusMessages, BringWhatWasPutIntoThem) {
    ServiceRun run(host);
    run.start();
    bus::Connection server(ServiceRun::address());
    ASSERT_TRUE(server.acquireName("com.example.Echo"));
    std::string got;
    const bus::Slot slot = server.serve("/com/example", [&](const bus::Message& message) {
        bus::Reader reader(message);
        got = reader.asWord();
        for (int i = 0; i < 3; ++i) {
            got += " " + reader.asWord();
        }
        reader.array("{sv}", [&] {
            reader.entry("sv", [&] {
                got += " " + reader.text();
                got += "=" + call::variantText(reader);
            });
        });
        got += reader.atEnd() ? "." : "...";
        const bus::Message reply = message.reply();
        bus::Writer(reply).put(got);
        server.send(reply);
    });
    const bus::Message call =
        run.bus().newCall({"com.example.Echo", "/com/example/below", "com.example.E", "Echo"});
    bus::Writer writer(call);
    writer.put(true).put(std::uint64_t{7}).put(2.5).put("x\xFF").array("{sv}", [&] {
        writer.entry("sv", [&] {
            writer.put("k").variant("as", [&] { writer.put(std::vector<std::string>{"a", "b"}); });
        });
    });
    std::string answered;
    const bus::Slot pending = run.bus().askLater(call, 5s, [&](const bus::Message& answer) {
        answered = answer.isError() ? answer.error().what() : bus::Reader(answer).text();
    });
    EXPECT_TRUE(call::until(run.bus(), [&] {
        server.process();
        return !answered.empty();
    }));
    EXPECT_EQ(answered, "1 7 2.5 x\xEF\xBF\xBD k=a b.");
}

HOST_TEST(BusMessages, TellWhoReadsSomethingElse) {
    ServiceRun run(host);
    run.start();
    const bus::Message answer = call::ask(run.bus(), ServiceRun::kRoot, call::kAgent, "EventsSince",
                                          [](bus::Writer& writer) { writer.put(std::uint64_t{0}); });
    const auto reading = [&](const auto& take) {
        try {
            bus::Reader reader(answer);
            take(reader);
            return std::string("read");
        } catch (const bus::Error& error) {
            return error.name();
        }
    };
    EXPECT_EQ(reading([](bus::Reader& reader) { reader.number(); }), bus::kInvalidArgs);
    EXPECT_EQ(reading([](bus::Reader& reader) { reader.asWord(); }), bus::kInvalidArgs);
    EXPECT_EQ(reading([](bus::Reader& reader) { reader.bytes(); }), bus::kInvalidArgs);
    EXPECT_EQ(reading([](bus::Reader& reader) { call::variantText(reader); }), bus::kInvalidArgs);
    EXPECT_EQ(reading([](bus::Reader& reader) {
                  reader.skip();
                  reader.skip();
                  reader.skip();
              }),
              bus::kInvalidArgs);
    EXPECT_EQ(reading([](bus::Reader& reader) {
                  reader.skip();
                  reader.longNumber();
              }),
              "read");
}

/// An exception of a handler is the caller's answer.
HOST_TEST(BusHandlers, AnswerWithWhatTheyThrow) {
    ServiceRun run(host);
    run.start();
    bus::Connection server(ServiceRun::address());
    ASSERT_TRUE(server.acquireName("com.example.Thrower"));
    const bus::Slot slot = server.serve("/x", [](const bus::Message& message) {
        if (message.member() == "Own") {
            throw bus::Error("com.example.Wrong", "it went wrong");
        }
        throw std::runtime_error("it went\xFF wrong");
    });
    std::vector<std::string> answers;
    std::vector<bus::Slot> pending;
    for (const char* member : {"Own", "Other"}) {
        pending.push_back(
            run.bus().askLater(run.bus().newCall({"com.example.Thrower", "/x", "com.example.T", member}), 5s,
                               [&](const bus::Message& answer) {
                                   answers.push_back(answer.error().name() + ": " + answer.error().what());
                               }));
    }
    EXPECT_TRUE(call::until(run.bus(), [&] {
        server.process();
        return answers.size() == 2;
    }));
    EXPECT_THAT(answers,
                testing::ElementsAre("com.example.Wrong: it went wrong",
                                     "org.freedesktop.DBus.Error.Failed: it went\xEF\xBF\xBD wrong"));
}

TEST(BusConnection, ToNowhereSaysSo) {
    try {
        const bus::Connection connection("unix:path=/nowhere/bus");
        FAIL();
    } catch (const bus::Error& error) {
        EXPECT_STREQ(error.what(), "cannot reach the bus unix:path=/nowhere/bus: No such file or directory");
    }
}

}  // namespace
