// What strangers send: forged answers, texts of many megabytes, descriptors, wrong types.
#include <gmock/gmock.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <limits>

#include "tests/service/service_run.h"

namespace {

constexpr unsigned kStranger = 12345;
constexpr const char* kDeniedCall = "org.freedesktop.DBus.Error.AccessDenied";

/// Messages byte by byte, since the library sends nothing that is forged.
class RawMessage {
public:
    void word(std::uint32_t value) {
        align(4);
        bytes_.append(reinterpret_cast<const char*>(&value), sizeof(value));
    }
    void text(const std::string& value) {
        word(static_cast<std::uint32_t>(value.size()));
        bytes_ += value + '\0';
    }
    void signature(const std::string& value) {
        bytes_ += static_cast<char>(value.size());
        bytes_ += value + '\0';
    }
    void align(std::size_t size) { bytes_.resize((bytes_.size() + size - 1) / size * size); }
    const std::string& bytes() const { return bytes_; }

    /// An answer to a call with that number which says that its sender is root.
    static std::string forgedCredentials(const std::string& victim, std::uint32_t number) {
        RawMessage body;
        body.word(24);
        body.align(8);
        body.text("UnixUserID");
        body.signature("u");
        body.word(0);
        RawMessage fields;
        fields.field(5, "u");
        fields.word(number);
        fields.field(6, "s");
        fields.text(victim);
        fields.field(8, "g");
        fields.signature("a{sv}");
        RawMessage whole;
        whole.bytes_ = std::string{'l', 2, 1, 1};
        whole.word(static_cast<std::uint32_t>(body.bytes().size()));
        whole.word(number + 100);
        whole.word(static_cast<std::uint32_t>(fields.bytes().size()));
        whole.bytes_ += fields.bytes();
        whole.align(8);
        return whole.bytes_ + body.bytes();
    }

private:
    void field(char code, const std::string& type) {
        align(8);
        bytes_ += code;
        signature(type);
    }
    std::string bytes_;
};

std::string serviceName(const bus::Connection& own) {
    const bus::Message call = own.newCall(
        {"org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus", "GetNameOwner"});
    bus::Writer(call).put("com.vantrel.Corvista1");
    return bus::Reader(own.ask(call, std::chrono::seconds(10))).text();
}

/// Its answers arrive behind its own call: when the service has asked the bus who called, they are the next
/// that it reads.
HOST_TEST(ServiceAttack, ForgedAnswersMakeNobodyRoot) {
    ServiceRun run(host);
    run.start();
    const std::string told = call::asUser(kStranger, {}, [] {
        bus::Connection own(ServiceRun::address());
        const std::string victim = serviceName(own);
        std::string answer;
        const bus::Slot slot = own.askLater(
            call::make(own, ServiceRun::kComputer, call::kNode, "Write", call::write(115, "mine")),
            std::chrono::seconds(10), [&](const bus::Message& message) {
                answer = message.isError() ? message.error().name() : "written";
            });
        own.flush();
        std::string forged;
        for (std::uint32_t number = 1; number < 300; ++number) {
            forged += RawMessage::forgedCredentials(victim, number);
        }
        for (std::size_t sent = 0; sent < forged.size();) {
            const ssize_t size =
                ::send(own.descriptor(), forged.data() + sent, forged.size() - sent, MSG_NOSIGNAL);
            if (size > 0) {
                sent += static_cast<std::size_t>(size);
            } else if (errno != EAGAIN) {
                return std::string("the bus takes no more");
            }
        }
        call::until(own, [&] { return !answer.empty(); });
        return answer;
    });
    if (told == "no other user") {
        GTEST_SKIP() << told;
    }
    EXPECT_EQ(told, kDeniedCall);
    EXPECT_EQ(run.diary().find("115="), std::string::npos);
}

MATCHER(IsShort, "") {
    *result_listener << arg.size() << " bytes";
    return arg.size() < 70000;
}

/// Calls that wait for their turn keep what came with them.
HOST_TEST(ServiceAttack, LongWordsAreNotKept) {
    ServiceRun run(host);
    run.start();
    host.file("/var/hold", "");
    std::vector<bus::Slot> pending;
    const auto ignore = [](const bus::Message&) {};
    for (int reader = 0; reader < 8; ++reader) {  // all that the service has
        pending.push_back(run.bus().askLater(
            call::make(run.bus(), ServiceRun::kComputer, call::kNode, "Read",
                       [](bus::Writer& writer) { writer.put(std::vector<std::uint32_t>{904}); }),
            std::chrono::seconds(60), ignore));
    }
    const std::string longWord(std::size_t{1} << 20U, 'x');
    EXPECT_EQ(call::errorOf(run.bus(), ServiceRun::kRoot, call::kAgent, "Find",
                            [&](bus::Writer& writer) { writer.put(longWord); }),
              "com.vantrel.Corvista1.Error.NotFound");
    host.remove("/var/hold");
}

/// An answer larger than the bus takes would end the service's connection.
HOST_TEST(ServiceAttack, LongTextsAreNotRepeated) {
    ServiceRun run(host);
    run.start();
    const std::string longText(std::size_t{4} << 20U, 'x');
    const auto errorOf = [&](const std::string& path, const char* interface, const char* member,
                             const call::Arguments& arguments) {
        try {
            call::ask(run.bus(), path, interface, member, arguments);
            return std::string("no error");
        } catch (const bus::Error& error) {
            return std::string(error.what());
        }
    };
    const auto get = [&](const std::string& interface, const std::string& name) {
        return errorOf(ServiceRun::kRoot, call::kProperties, "Get",
                       [&](bus::Writer& writer) { writer.put(interface).put(name); });
    };
    EXPECT_THAT(get(call::kAgent, longText), IsShort());
    EXPECT_THAT(get(longText, "x"), IsShort());
    EXPECT_THAT(errorOf(ServiceRun::kRoot + ("/" + longText), call::kProperties, "GetAll",
                        [](bus::Writer& writer) { writer.put(""); }),
                IsShort());
    EXPECT_THAT(errorOf(ServiceRun::kComputer, call::kNode, "Write", call::write(115, longText)), IsShort());
    EXPECT_THAT(
        errorOf(ServiceRun::kRoot, call::kAgent, "Find", [&](bus::Writer& writer) { writer.put(longText); }),
        IsShort());
    EXPECT_EQ(run.diary().find("115="), std::string::npos);
}

HOST_TEST(ServiceAttack, WrongTypesAndNumbersAreAnswered) {
    ServiceRun run(host);
    run.start();
    const auto agent = [&](const char* member, const call::Arguments& arguments) {
        return call::errorOf(run.bus(), ServiceRun::kRoot, call::kAgent, member, arguments);
    };
    EXPECT_EQ(agent("Tree", [](bus::Writer& writer) { writer.put("x"); }), bus::kInvalidArgs);
    EXPECT_EQ(agent("Read", [](bus::Writer& writer) { writer.put("x").put("y"); }), bus::kInvalidArgs);
    EXPECT_EQ(agent("Write",
                    [](bus::Writer& writer) {
                        writer.put(std::uint32_t{3}).put(std::uint32_t{115}).variant("a{sv}", [&] {
                            writer.array("{sv}", [] {});
                        });
                    }),
              bus::kInvalidArgs);
    EXPECT_EQ(agent("Write",
                    [](bus::Writer& writer) {
                        writer.put(std::uint32_t{3}).put(std::uint32_t{115}).variant("as", [&] {
                            writer.put(std::vector<std::string>(1025, "x"));
                        });
                    }),
              bus::kLimitsExceeded);
    EXPECT_EQ(agent("Read",
                    [](bus::Writer& writer) {
                        writer.put(std::uint32_t{3}).put(std::vector<std::uint32_t>(1025, 108));
                    }),
              bus::kLimitsExceeded);
    EXPECT_EQ(agent("Read",
                    [](bus::Writer& writer) {
                        writer.put(std::uint32_t{4294967295}).put(std::vector<std::uint32_t>{108});
                    }),
              "com.vantrel.Corvista1.Error.NotFound");
    const call::ToldEvents none = call::eventsSince(run.bus(), std::numeric_limits<std::uint64_t>::max());
    EXPECT_EQ(none.events.size() + none.dropped, 0U);
    EXPECT_EQ(run.diary().find("115="), std::string::npos);
}

/// Descriptors that come with calls would fill the service's table.
HOST_TEST(ServiceAttack, DescriptorsAreNotTaken) {
    ServiceRun run(host);
    run.start();
    sd_bus* sender = nullptr;
    ASSERT_GE(sd_bus_new(&sender), 0);
    sd_bus_set_address(sender, ServiceRun::address().c_str());
    sd_bus_set_bus_client(sender, 1);
    sd_bus_negotiate_fds(sender, 1);
    ASSERT_GE(sd_bus_start(sender), 0);
    sd_bus_message* message = nullptr;
    sd_bus_message_new_method_call(sender, &message, "com.vantrel.Corvista1", ServiceRun::kComputer,
                                   call::kNode, "Read");
    ASSERT_GE(sd_bus_message_append(message, "auh", 1, 904, STDERR_FILENO), 0);
    sd_bus_error error{};
    EXPECT_LT(sd_bus_call(sender, message, 5000000, &error, nullptr), 0);
    EXPECT_STREQ(error.name, "org.freedesktop.DBus.Error.NotSupported");
    sd_bus_error_free(&error);
    sd_bus_message_unref(message);
    sd_bus_unref(sender);
}

/// The name of the first error among all that comes.
int takeError(sd_bus_message* message, void* name, sd_bus_error* /*error*/) {
    std::string& told = *static_cast<std::string*>(name);
    if (told.empty() && bus::Message::share(message).isError()) {
        told = bus::Message::share(message).error().name();
    }
    return 0;
}

/// The bus lets strangers call the service and no more: what they signal does not reach it.
HOST_TEST(ServiceAttack, SignalsDoNotReachTheService) {
    ServiceRun run(host);
    run.start();
    const std::string told = call::asUser(kStranger, {}, [] {
        bus::Connection own(ServiceRun::address());
        const bus::Message signal =
            own.newSignal("/org/freedesktop/DBus", "org.freedesktop.DBus", "NameOwnerChanged");
        sd_bus_message_set_destination(signal.get(), serviceName(own).c_str());
        bus::Writer(signal).put("org.freedesktop.PolicyKit1").put("").put(own.uniqueName());
        std::string refused;
        sd_bus_add_filter(own.get(), nullptr, takeError, &refused);
        own.send(signal);
        call::until(own, [&] { return !refused.empty(); });
        return refused;
    });
    if (told == "no other user") {
        GTEST_SKIP() << told;
    }
    EXPECT_EQ(told, kDeniedCall);
}

/// No stranger listens to what root is told.
HOST_TEST(ServiceAttack, AnswersToOthersAreNotOverheard) {
    ServiceRun run(host);
    run.start();
    const std::string told = call::asUser(kStranger, {}, [] {
        bus::Connection own(ServiceRun::address());
        const bus::Message monitor = own.newCall({"org.freedesktop.DBus", "/org/freedesktop/DBus",
                                                  "org.freedesktop.DBus.Monitoring", "BecomeMonitor"});
        bus::Writer(monitor).put(std::vector<std::string>()).put(std::uint32_t{0});
        try {
            own.ask(monitor, std::chrono::seconds(5));
            return std::string("a monitor");
        } catch (const bus::Error& error) {
            return error.name();
        }
    });
    if (told == "no other user") {
        GTEST_SKIP() << told;
    }
    EXPECT_EQ(told, kDeniedCall);
}

}  // namespace
