// Writes through the service, and what everybody hears of them.
#include <gmock/gmock.h>
#include <signal.h>

#include "tests/service/service_run.h"
#include "tests/support/waiting.h"

namespace {

using testing::ElementsAre;
using testing::HasSubstr;

constexpr const char* kComputerInterface = "com.vantrel.Corvista1.Computer";
constexpr std::uint32_t kContact = 115;

class ServiceWrites : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        run.emplace(host);
        run->start();
    }
    /// "VERDICT BEFORE AFTER LACKING"
    std::string write(std::uint32_t property, const std::string& value) {
        const bus::Message answer =
            call::ask(run->bus(), ServiceRun::kComputer, call::kNode, "Write", call::write(property, value));
        bus::Reader reader(answer);
        const ToldReading before = call::reading(reader);
        const ToldReading after = call::reading(reader);
        const std::string verdict = reader.text();
        complained = reader.flag();
        reader.skip();
        errors = reader.texts();
        return verdict + " '" + before.value + "' '" + after.value + "'";
    }
    std::string errorOfWrite(std::uint32_t property, const std::string& value) {
        return call::errorOf(run->bus(), ServiceRun::kComputer, call::kNode, "Write",
                             call::write(property, value));
    }

    std::optional<ServiceRun> run;
    bool complained = false;
    std::vector<std::string> errors;
};

HOST_TEST_F(ServiceWrites, ChangeTheHostAndTellHow) {
    EXPECT_EQ(write(kContact, "room 4"), "applied '' 'room 4'");
    EXPECT_FALSE(complained);
    EXPECT_EQ(write(kContact, "room 5"), "applied 'room 4' 'room 5'");
    EXPECT_TRUE(complained);
    EXPECT_THAT(errors, ElementsAre(HasSubstr("the disk is nearly full")));
    EXPECT_EQ(call::get(run->bus(), ServiceRun::kComputer, kComputerInterface, "OwnerContact"), "room 5");
    EXPECT_THAT(run->diary(), HasSubstr("115=room 4\n115=room 5\n"));
}

/// The node's other facts can be others, too; the next look at everything is ten minutes away.
HOST_TEST_F(ServiceWrites, HaveTheirNodeLookedAtAgain) {
    const auto readAt = [this] {
        return std::stoull(call::get(run->bus(), ServiceRun::kComputer, call::kNode, "ReadAt"));
    };
    const auto before = readAt();
    EXPECT_EQ(write(kContact, "room 4"), "applied '' 'room 4'");
    EXPECT_TRUE(eventually([&] { return readAt() > before; }));
}

HOST_TEST_F(ServiceWrites, ThatMustNotBeChangeNothing) {
    const std::string prefix = "com.vantrel.Corvista1.Error.";
    EXPECT_EQ(errorOfWrite(kContact, "two\nlines"), prefix + "Refused");
    EXPECT_EQ(errorOfWrite(126000, "x"), prefix + "NotFound");
    EXPECT_EQ(errorOfWrite(123, "77"), prefix + "Refused");
    EXPECT_EQ(call::errorOf(run->bus(), ServiceRun::kRoot, call::kAgent, "Write",
                            [](bus::Writer& writer) {
                                writer.put(std::uint32_t{424242}).put(kContact).variant("s", [&] {
                                    writer.put("x");
                                });
                            }),
              prefix + "NotFound");
    EXPECT_EQ(call::errorOf(run->bus(), ServiceRun::kComputer, call::kNode, "Write",
                            [](bus::Writer& writer) {
                                writer.put(kContact).variant("a{ss}", [&] { writer.array("{ss}", [] {}); });
                            }),
              bus::kInvalidArgs);
    EXPECT_EQ(run->diary().find('='), std::string::npos);
}

/// The error says behind its message what the problem is with, and what the plug-in reported.
HOST_TEST_F(ServiceWrites, ThatFailTellWhy) {
    const bus::Message call =
        call::make(run->bus(), ServiceRun::kComputer, call::kNode, "Write", call::write(116, "x"));
    std::vector<std::string> told;
    const bus::Slot slot =
        run->bus().askLater(call, std::chrono::seconds(10), [&](const bus::Message& answer) {
            bus::Reader reader(answer);
            told = {answer.error().name(), reader.text(), reader.text(), reader.text()};
        });
    ASSERT_TRUE(call::until(run->bus(), [&] { return !told.empty(); }));
    EXPECT_THAT(told,
                ElementsAre("com.vantrel.Corvista1.Error.Failed", HasSubstr("the disk is full"), "", ""));
}

/// Everybody hears of a write: what has changed, and the event with its number and its writer.
HOST_TEST_F(ServiceWrites, AreToldToEverybody) {
    bus::Connection listener(ServiceRun::address());
    std::vector<ToldEvent> events;
    std::map<std::string, std::string> changed;
    const bus::Slot eventSlot =
        listener.match("type='signal',interface='com.vantrel.Corvista1.Agent',member='Event'",
                       [&](const bus::Message& signal) {
                           bus::Reader reader(signal);
                           events.push_back(call::event(reader));
                       });
    const bus::Slot changeSlot =
        listener.match("type='signal',member='PropertiesChanged'", [&](const bus::Message& signal) {
            bus::Reader reader(signal);
            const std::string interface = reader.text();
            reader.array("{sv}", [&] {
                reader.entry("sv", [&] {
                    const std::string name = reader.text();
                    changed[signal.path() + " " + interface + " " + name] = call::variantText(reader);
                });
            });
        });
    listener.uniqueName();
    call::get(listener, ServiceRun::kRoot, call::kAgent, "Version");  // the matches are in force
    EXPECT_EQ(write(kContact, "room 4"), "applied '' 'room 4'");
    ASSERT_TRUE(call::until(listener, [&] { return !events.empty() && !changed.empty(); }));
    EXPECT_EQ(
        changed,
        (std::map<std::string, std::string>{
            {std::string(ServiceRun::kComputer) + " " + kComputerInterface + " OwnerContact", "room 4"}}));
    ASSERT_EQ(events.size(), 1U);
    EXPECT_EQ(events[0].number, 1U);
    EXPECT_EQ(events[0].kind, "written");
    EXPECT_EQ(events[0].path, "/oshw/root/computer");
    EXPECT_EQ(events[0].property, "OwnerContact");
    EXPECT_EQ(events[0].after, "room 4");
    EXPECT_EQ(events[0].caller, "root (uid 0)");
    EXPECT_EQ(events[0].wanted, "room 4");
    EXPECT_EQ(events[0].verdict, "applied");
    const call::ToldEvents since = call::eventsSince(run->bus(), 0);
    EXPECT_EQ(since.dropped, 0U);
    ASSERT_EQ(since.events.size(), 1U);
    EXPECT_EQ(since.events[0].number, events[0].number);
    EXPECT_EQ(call::get(run->bus(), ServiceRun::kRoot, call::kAgent, "LastEvent"), "1");
}

/// A node that a write makes is an object soon after, and who listens is told.
HOST_TEST_F(ServiceWrites, ThatMakeANodeMakeAnObject) {
    bus::Connection listener(ServiceRun::address());
    std::vector<std::string> added;
    const bus::Slot slot =
        listener.match("type='signal',member='InterfacesAdded'",
                       [&](const bus::Message& signal) { added.push_back(bus::Reader(signal).path()); });
    call::get(listener, ServiceRun::kRoot, call::kAgent, "Version");
    call::ask(run->bus(), ServiceRun::kPort + std::string("/ip_2dconfig_3aeth0"), call::kNode, "Write",
              call::write(74, "1"));
    ASSERT_TRUE(call::until(listener, [&] { return !added.empty(); }));
    EXPECT_THAT(added, ElementsAre(HasSubstr("network_2dport_3aeth1")));
    EXPECT_EQ(call::get(listener, added[0], call::kNode, "Class"), "network-port");
}

/// A change of the host is not cut off by a stop of the service.
HOST_TEST_F(ServiceWrites, AreBroughtToTheirEndByAStop) {
    host.file("/var/hold", "");
    bool answered = false;
    const bus::Slot slot = run->bus().askLater(
        call::make(run->bus(), ServiceRun::kComputer, call::kNode, "Write", call::write(kContact, "hold")),
        std::chrono::seconds(30), [&](const bus::Message& answer) { answered = !answer.isError(); });
    ASSERT_TRUE(call::until(run->bus(), [&] { return run->diary().find("115=hold") != std::string::npos; }));
    run->program().signal(SIGTERM);
    EXPECT_FALSE(call::until(run->bus(),
                             [&, rounds = 0]() mutable { return ++rounds > 80 || !run->bus().isOpen(); }) &&
                 !run->bus().isOpen())
        << "it waits for the write";
    host.remove("/var/hold");
    EXPECT_TRUE(call::until(run->bus(), [&] { return answered; }));
    EXPECT_EQ(run->program().wait().status, 128 + SIGTERM);
    EXPECT_THAT(run->diary(), HasSubstr("unload"));
}

}  // namespace
