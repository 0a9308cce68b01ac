// Who may what: root, the trusted group, others; with and without polkit.
#include <gmock/gmock.h>

#include "tests/service/service_run.h"

namespace {

using testing::HasSubstr;
using testing::Not;

constexpr std::uint32_t kContact = 115;
constexpr unsigned kUser = 12345;
constexpr unsigned kGroup = 12345;
constexpr const char* kDenied = "org.freedesktop.DBus.Error.AccessDenied";

/// A polkit that answers as it was told, or not at all.
class Polkit {
public:
    Polkit() : bus_(ServiceRun::address()) {
        bus_.acquireName("org.freedesktop.PolicyKit1");
        slot_ = bus_.serve("/org/freedesktop/PolicyKit1/Authority",
                           [this](const bus::Message& message) { asked(message); });
    }

    bus::Connection& bus() { return bus_; }
    void process() {
        bus_.process();
        while (answers && !waiting_.empty()) {
            const bus::Message reply = waiting_.back().reply();
            bus::Writer writer(reply);
            writer.structure("bba{ss}", [&] { writer.put(yes).put(!yes).array("{ss}", [] {}); });
            bus_.send(reply);
            waiting_.pop_back();
        }
    }

    bool yes = false;
    bool answers = true;
    std::vector<std::string> questions;  ///< "ACTION SUBJECT FLAGS"

private:
    void asked(const bus::Message& message) {
        std::string subject;
        bus::Reader reader(message);
        reader.structure("sa{sv}", [&] {
            subject = reader.text();
            reader.array("{sv}", [&] {
                reader.entry("sv", [&] {
                    subject += " " + reader.text();
                    subject += "=" + call::variantText(reader);
                });
            });
        });
        const std::string action = reader.text();
        reader.skip();
        questions.push_back(action + " " + subject + " " + std::to_string(reader.number()));
        waiting_.push_back(message);
    }

    bus::Connection bus_;
    bus::Slot slot_;
    std::vector<bus::Message> waiting_;
};

class ServiceConsent : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        run.emplace(host);
        run->start();
        const std::string tried = call::asUser(kUser, {}, [] { return std::string("yes"); });
        if (tried != "yes") {
            GTEST_SKIP() << tried;
        }
    }
    static std::string writeOnce(bool interactive = false, std::uint32_t property = kContact,
                                 const std::string& value = "mine") {
        bus::Connection own(ServiceRun::address());
        bus::Message message =
            call::make(own, ServiceRun::kComputer, call::kNode, "Write", call::write(property, value));
        if (interactive) {
            message.allowInteraction();
        }
        own.ask(message, std::chrono::seconds(10));
        return "written";
    }

    /// "planned", "made", or the name of the error.
    static std::string changeOnce(const char* member, const std::string& property = "OwnerContact",
                                  const std::string& value = "mine", bool interactive = false) {
        bus::Connection own(ServiceRun::address());
        bus::Message message =
            call::make(own, ServiceRun::kRoot, call::kAgent, member, [&](bus::Writer& writer) {
                writer.array("(ssv)", [&] {
                    writer.structure("ssv", [&] {
                        writer.put("computer").put(property);
                        writer.variant("s", [&] { writer.put(value); });
                    });
                });
                if (member == std::string("Apply")) {
                    writer.array("{sv}", [] {});
                }
            });
        if (interactive) {
            message.allowInteraction();
        }
        own.ask(message, std::chrono::seconds(60));
        return member == std::string("Plan") ? "planned" : "made";
    }

    std::optional<ServiceRun> run;
};

HOST_TEST_F(ServiceConsent, WithoutPolkitIsRootsAndTheGroups) {
    EXPECT_EQ(call::asUser(kUser, {}, [] { return writeOnce(); }), kDenied);
    EXPECT_EQ(run->diary().find('='), std::string::npos);
    EXPECT_THAT(
        run->program().err(),
        HasSubstr("uid 12345 may not write /oshw/root/computer OwnerContact: without polkit this is for root "
                  "and the group corvista"));
    EXPECT_EQ(call::asUser(kUser, kGroup, [] { return writeOnce(); }), "written");
    EXPECT_EQ(call::asUser(0, {}, [] { return writeOnce(); }), "written");
    EXPECT_THAT(run->program().err(),
                HasSubstr("alice (uid 12345) wrote /oshw/root/computer OwnerContact: applied"));
    EXPECT_EQ(call::get(run->bus(), ServiceRun::kRoot, call::kAgent, "Consent"), "group");
}

HOST_TEST_F(ServiceConsent, OfReadingIsEverybodys) {
    EXPECT_EQ(call::asUser(kUser, {},
                           [] {
                               const bus::Connection own(ServiceRun::address());
                               return call::read(own, ServiceRun::kComputer, {108}).front().value +
                                      call::get(own, ServiceRun::kComputer, "com.vantrel.Corvista1.Computer",
                                                "HostName");
                           }),
              "fakefake");
}

/// Who talks to polkit's question as somebody else: the subject is the connection that the bus names.
HOST_TEST_F(ServiceConsent, IsPolkitsWhereThereIsOne) {
    Polkit polkit;
    for (const bool yes : {false, true}) {
        polkit.yes = yes;
        const std::string answer = call::asUserBeside(
            kUser, [] { return writeOnce(); }, [&] { polkit.process(); });
        EXPECT_EQ(answer, yes ? "written" : kDenied);
    }
    ASSERT_EQ(polkit.questions.size(), 2U);
    EXPECT_THAT(polkit.questions[0], HasSubstr("com.vantrel.corvista1.write system-bus-name name=:1."));
    EXPECT_THAT(polkit.questions[0], testing::EndsWith(" 0"));
    EXPECT_THAT(run->diary(), HasSubstr("115=mine\n"));
    EXPECT_EQ(call::get(run->bus(), ServiceRun::kRoot, call::kAgent, "Consent"), "polkit");
    EXPECT_THAT(run->program().err(),
                HasSubstr("polkit would have to ask the user, and the call does not let it"));
    // The group does not help where polkit decides; what stops the host is a question of its own.
    polkit.yes = false;
    EXPECT_EQ(call::asUserBeside(
                  kUser, [] { return writeOnce(true, 123, "9"); }, [&] { polkit.process(); }, kGroup),
              kDenied);
    EXPECT_THAT(polkit.questions[2], HasSubstr("com.vantrel.corvista1.power "));
    EXPECT_THAT(polkit.questions[2], testing::EndsWith(" 1"));
    EXPECT_EQ(run->diary().find("123="), std::string::npos);
}

HOST_TEST_F(ServiceConsent, ToPlansAndChangesIsRootsAndTheGroupsWithoutPolkit) {
    for (const char* member : {"Plan", "Apply"}) {
        EXPECT_EQ(call::asUser(kUser, {}, [&] { return changeOnce(member); }), kDenied);
    }
    EXPECT_EQ(run->diary().find('='), std::string::npos);
    EXPECT_THAT(run->program().err(), HasSubstr("uid 12345 may not plan /oshw/root/computer OwnerContact: "
                                                "without polkit this is for root"));
    EXPECT_THAT(run->program().err(), HasSubstr("uid 12345 may not apply /oshw/root/computer OwnerContact"));
    EXPECT_EQ(call::asUser(kUser, kGroup, [] { return changeOnce("Plan"); }), "planned");
    EXPECT_EQ(call::asUser(kUser, kGroup, [] { return changeOnce("Apply"); }), "made");
    EXPECT_THAT(run->diary(), HasSubstr("115=mine\n"));
}

/// Each has its question; what stops the host its own; nothing is done before the answer.
HOST_TEST_F(ServiceConsent, ToPlansAndChangesIsPolkitsWhereThereIsOne) {
    Polkit polkit;
    polkit.answers = false;
    const auto asked = [&](const std::function<std::string()>& question, bool yes) {
        polkit.answers = false;
        polkit.yes = yes;
        const std::size_t before = polkit.questions.size();
        return call::asUserBeside(kUser, question, [&] {
            polkit.process();
            polkit.answers = polkit.answers || polkit.questions.size() > before;
        });
    };
    for (const bool yes : {false, true}) {
        EXPECT_EQ(asked([] { return changeOnce("Plan"); }, yes), yes ? "planned" : kDenied);
        EXPECT_EQ(run->diary().find('='), std::string::npos);
        EXPECT_EQ(asked([&] { return changeOnce("Apply", "OwnerContact", "x", true); }, yes),
                  yes ? "made" : kDenied);
    }
    EXPECT_EQ(asked([] { return changeOnce("Apply", "PowerAction", "9"); }, false), kDenied);
    EXPECT_EQ(run->diary().find("123="), std::string::npos);
    ASSERT_EQ(polkit.questions.size(), 5U);
    EXPECT_THAT(polkit.questions[0], testing::StartsWith("com.vantrel.corvista1.plan system-bus-name name="));
    EXPECT_THAT(polkit.questions[0], testing::EndsWith(" 0"));
    EXPECT_THAT(polkit.questions[1], testing::StartsWith("com.vantrel.corvista1.write "));
    EXPECT_THAT(polkit.questions[1], testing::EndsWith(" 1"));
    EXPECT_THAT(polkit.questions[4], testing::StartsWith("com.vantrel.corvista1.power "));
}

HOST_TEST_F(ServiceConsent, ToKeepingAndTakingBackChangesIsAQuestionOfItsOwn) {
    Polkit polkit;
    polkit.yes = true;
    for (const char* member : {"Confirm", "Rollback"}) {
        const auto question = [member] {
            const bus::Connection own(ServiceRun::address());
            return call::errorOf(own, ServiceRun::kRoot, call::kAgent, member,
                                 [](bus::Writer& writer) { writer.put(std::uint32_t{7}); });
        };
        EXPECT_EQ(call::asUserBeside(kUser, question, [&] { polkit.process(); }),
                  "com.vantrel.Corvista1.Error.NotFound");
        EXPECT_THAT(polkit.questions.back(), testing::StartsWith("com.vantrel.corvista1.confirm "));
    }
    polkit.yes = false;
    EXPECT_EQ(call::asUserBeside(
                  kUser,
                  [] {
                      const bus::Connection own(ServiceRun::address());
                      return call::errorOf(
                          own, ServiceRun::kRoot, call::kAgent, "Lengthen",
                          [](bus::Writer& writer) { writer.put(std::uint32_t{7}).put(1.5); });
                  },
                  [&] { polkit.process(); }),
              kDenied);
}

/// Polkit may take its time, as a user does: meanwhile everybody else is answered, and nothing is done.
HOST_TEST_F(ServiceConsent, ThatIsSlowHoldsNobodyUp) {
    Polkit polkit;
    polkit.answers = false;
    polkit.yes = true;
    bool asked = false;
    const std::string answer = call::asUserBeside(
        kUser, [] { return writeOnce(true); },
        [&] {
            polkit.process();
            if (!asked && !polkit.questions.empty()) {
                asked = true;
                EXPECT_EQ(call::get(run->bus(), ServiceRun::kComputer, "com.vantrel.Corvista1.Computer",
                                    "HostName"),
                          "fake");
                EXPECT_EQ(run->diary().find('='), std::string::npos);
                polkit.answers = true;
            }
        });
    EXPECT_TRUE(asked);
    EXPECT_EQ(answer, "written");
}

/// The name of polkit goes to nobody but root on a bus of ours.
HOST_TEST_F(ServiceConsent, IsNotAStrangersToGive) {
    EXPECT_THAT(call::asUser(kUser, {},
                             [] {
                                 const bus::Connection own(ServiceRun::address());
                                 own.acquireName("org.freedesktop.PolicyKit1");
                                 return std::string("taken");
                             }),
                Not(HasSubstr("taken")));
}

/// A node with a serial number: root and the group see it, others hear that there is something.
class ServiceSecrets : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        host.file("/sys/class/dmi/id/product_serial", "S3CR3T\n");
        host.file("/sys/class/dmi/id/product_name", "Model 1\n");
        run.emplace(host);
        run->plugin(HARDWARE_FILE).start();
        if (call::asUser(kUser, {}, [] { return std::string("yes"); }) != "yes") {
            GTEST_SKIP();
        }
    }
    static constexpr const char* kSystem = "/com/vantrel/Corvista1/hardware/system";
    static constexpr const char* kInterface = "com.vantrel.Corvista1.System";
    /// All that a user finds, in each of the ways.
    static std::string look() {
        const bus::Connection own(ServiceRun::address());
        const auto get = [&](const std::string& name) {
            try {
                return call::get(own, kSystem, kInterface, name);
            } catch (const bus::Error& error) {
                return error.name();
            }
        };
        std::string told = get("Model") + " " + get("SerialNumber");
        for (const auto& [name, value] : call::getAll(own, kSystem, kInterface)) {
            told += " " + name + "=" + value;
        }
        for (const ToldReading& reading : call::read(own, kSystem, {})) {
            told += " " + reading.value + " " + reading.error;
        }
        const bus::Message tree = call::ask(own, ServiceRun::kRoot, call::kAgent, "Tree");
        bus::Reader reader(tree);
        reader.skip();
        reader.array("(uuuuosssua(uyvtus))", [&] {
            reader.structure("uuuuosssua(uyvtus)", [&] {
                for (int i = 0; i < 9; ++i) {
                    reader.skip();
                }
                for (const ToldReading& each : call::readings(reader)) {
                    told += " " + each.value;
                }
            });
        });
        const bus::Message managed =
            call::ask(own, ServiceRun::kRoot, "org.freedesktop.DBus.ObjectManager", "GetManagedObjects");
        bus::Reader objects(managed);
        objects.array("{oa{sa{sv}}}", [&] {
            objects.entry("oa{sa{sv}}", [&] {
                objects.skip();
                objects.array("{sa{sv}}", [&] {
                    objects.entry("sa{sv}", [&] {
                        objects.skip();
                        objects.array("{sv}", [&] {
                            objects.entry("sv", [&] {
                                told += " " + objects.text();
                                told += "=" + call::variantText(objects);
                            });
                        });
                    });
                });
            });
        });
        return told;
    }
    std::optional<ServiceRun> run;
};

HOST_TEST_F(ServiceSecrets, AreForRootAndTheGroup) {
    const std::string others = call::asUser(kUser, {}, look);
    EXPECT_THAT(others, Not(HasSubstr("S3CR3T")));
    EXPECT_THAT(others, HasSubstr(std::string("Model 1 ") + kDenied));
    EXPECT_THAT(run->program().err(), HasSubstr("uid 12345 may not read "));
    EXPECT_THAT(others, HasSubstr("told to root and the trusted group only"));
    const std::string roots = call::asUser(0, {}, look);
    EXPECT_THAT(roots, HasSubstr("Model 1 S3CR3T"));
    EXPECT_EQ(call::asUser(kUser, kGroup, look), roots);
    std::size_t count = 0;
    for (std::size_t at = roots.find("S3CR3T"); at != std::string::npos; at = roots.find("S3CR3T", at + 1)) {
        ++count;
    }
    EXPECT_EQ(count, 5U) << "once by each of the ways";
}

}  // namespace
