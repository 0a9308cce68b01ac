// Plans and changes of several values as one, made by the service.
#include <gmock/gmock.h>
#include <signal.h>

#include <limits>
#include <nlohmann/json.hpp>

#include "tests/agent/linked_host.h"
#include "tests/service/service_run.h"
#include "tests/support/waiting.h"

namespace {

using namespace std::chrono_literals;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::Not;
using Json = nlohmann::json;

struct Wanted {
    std::string node;
    std::string property;
    std::vector<std::string> words;
};

void putChanges(bus::Writer& writer, const std::vector<Wanted>& changes) {
    writer.array("(ssv)", [&] {
        for (const Wanted& each : changes) {
            writer.structure("ssv", [&] {
                writer.put(each.node).put(each.property);
                writer.variant("as", [&] { writer.put(each.words); });
            });
        }
    });
}

bus::Message planCall(const bus::Connection& bus, const std::vector<Wanted>& changes) {
    return call::make(bus, ServiceRun::kRoot, call::kAgent, "Plan",
                      [&](bus::Writer& writer) { putChanges(writer, changes); });
}

using PutOptions = std::function<void(bus::Writer&)>;

void flag(bus::Writer& writer, const char* name, bool value = true) {
    writer.entry("sv", [&] { writer.put(name).variant("b", [&] { writer.put(value); }); });
}

void seconds(bus::Writer& writer, double value) {
    writer.entry("sv", [&] { writer.put("verify-within").variant("d", [&] { writer.put(value); }); });
}

bus::Message applyCall(
    const bus::Connection& bus, const std::vector<Wanted>& changes,
    const PutOptions& options = [](bus::Writer& writer) { flag(writer, "plain"); }) {
    return call::make(bus, ServiceRun::kRoot, call::kAgent, "Apply", [&](bus::Writer& writer) {
        putChanges(writer, changes);
        writer.array("{sv}", [&] { options(writer); });
    });
}

struct Told {
    std::vector<std::string> outcomes;  ///< "PROPERTY BEFORE AFTER VERDICT REASON LACKING PROBLEM"
    std::vector<std::string> texts;
    std::vector<std::string> errors;
};

Told toldBy(const bus::Message& answer) {
    Told told;
    bus::Reader reader(answer);
    reader.array("(uu(uyvtus)(uyvtus)ssbssas)", [&] {
        reader.structure("uu(uyvtus)(uyvtus)ssbssas", [&] {
            reader.skip();
            std::string text = std::to_string(reader.number());
            for (int i = 0; i < 2; ++i) {
                text += " '" + call::reading(reader).value + "'";
            }
            text += " " + reader.text();
            text += " '" + reader.text() + "'";
            text += reader.flag() ? " complained" : "";
            text += " '" + reader.text() + "'";
            text += " " + reader.text();
            reader.skip();
            told.outcomes.push_back(text);
        });
    });
    told.texts = reader.texts();
    told.errors = reader.texts();
    return told;
}

std::string errorOf(const bus::Connection& bus, const bus::Message& call) {
    try {
        bus.ask(call, 60s);
        return "";
    } catch (const bus::Error& error) {
        return error.name() + ": " + error.what();
    }
}

class ServiceChanges : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        run.emplace(host);
        run->start();
    }
    Told apply(const std::vector<Wanted>& changes, const PutOptions& options) {
        return toldBy(run->bus().ask(applyCall(run->bus(), changes, options), 60s));
    }
    /// As one that nobody waits for yet.
    bus::Slot begin(const bus::Message& call, std::optional<bus::Message>& answer) {
        return run->bus().askLater(call, 60s, [&answer](const bus::Message& come) { answer = come; });
    }
    bool isInDiary(const std::string& line) const { return run->diary().find(line) != std::string::npos; }

    std::optional<ServiceRun> run;
};

HOST_TEST_F(ServiceChanges, AreTriedOutMadeAndLookedAt) {
    const Told told = apply(
        {{"computer", "OwnerContact", {"room 4"}}, {"ip-config:eth0", "94", {"192.0.2.9", "2001:db8::1"}}},
        [](bus::Writer& writer) { seconds(writer, 0); });
    EXPECT_THAT(told.outcomes,
                ElementsAre("115 '' 'room 4' applied '' '' ", HasSubstr("'192.0.2.9 2001:db8::1' applied")));
    EXPECT_THAT(told.texts, ElementsAre()) << "they were tried out";
    EXPECT_LT(run->diary().find("94="), run->diary().find("115=room 4\n")) << "the interface comes first";
    EXPECT_THAT(run->program().err(),
                HasSubstr("root (uid 0) wrote /oshw/root/computer OwnerContact: applied"));
    EXPECT_EQ(call::get(run->bus(), ServiceRun::kComputer, "com.vantrel.Corvista1.Computer", "OwnerContact"),
              "room 4");
    const auto events = call::eventsSince(run->bus(), 0).events;
    ASSERT_EQ(events.size(), 2U);
    EXPECT_EQ(events[1].caller, "root (uid 0)");
    EXPECT_EQ(events[1].wanted, "room 4");
    const Told again = apply({{"computer", "OwnerContact", {"room 4"}}}, [](bus::Writer&) {});
    EXPECT_THAT(again.outcomes, ElementsAre("115 'room 4' 'room 4' unchanged '' '' "));
    EXPECT_EQ(call::eventsSince(run->bus(), 0).events.size(), 2U);
}

/// One that would fail keeps the other back, as long as nobody insists; then the other is made.
HOST_TEST_F(ServiceChanges, OfWhichOneWouldFailAreNotMade) {
    const std::vector<Wanted> changes = {{"computer", "OwnerContact", {"x"}},
                                         {"computer", "OwnerName", {"bob"}}};
    const auto nothing = [](bus::Writer&) {};
    EXPECT_EQ(
        errorOf(run->bus(), applyCall(run->bus(), changes, nothing)),
        "com.vantrel.Corvista1.Error.Failed: tried out, it fails: OwnerName was not changed: the disk is "
        "full");
    EXPECT_FALSE(isInDiary("="));
    const Told told = apply(changes, [](bus::Writer& writer) { flag(writer, "force"); });
    EXPECT_THAT(told.outcomes,
                ElementsAre(HasSubstr("'x' applied"),
                            HasSubstr("failed 'OwnerName was not changed: the disk is full' '' Failed")));
    EXPECT_TRUE(isInDiary("115=x\n"));
}

HOST_TEST_F(ServiceChanges, ThatMakeNoSenseOrAreTooManyChangeNothing) {
    const std::string error = "com.vantrel.Corvista1.Error.";
    const std::string limits = std::string(bus::kLimitsExceeded) + ": ";
    const std::string invalid = std::string(bus::kInvalidArgs) + ": ";
    const Wanted good{"computer", "OwnerContact", {"x"}};
    const std::vector<std::pair<std::vector<Wanted>, std::string>> bad = {
        {{good, {"nowhere", "OwnerContact", {"x"}}}, error + "NotFound: changes[1]: "},
        {{good, {"computer", "NoSuch", {"x"}}}, error + "NotFound: changes[1]: "},
        {{good, {"computer", "HostName", {"x"}}}, error + "Refused: changes[1]: "},
        {{good, {"computer", "115", {"two\nlines"}}}, error + "Refused: changes[1]: "},
        {{good, {"3", "115", {"y"}}}, error + "Refused: changes[1]: "},
        {{{"nowhere", "115", {"x"}}}, error + "NotFound: there is no node"},
        {std::vector<Wanted>(1001, good), limits + "more than 1000 changes"},
        {{{"computer", "115", std::vector<std::string>(257, "x")}}, limits + "changes[0] has more than 256"},
        {{good, {"computer", "116", {std::string(1 << 20, 'x')}}}, limits + "the changes are longer than"},
    };
    for (const auto& [changes, expected] : bad) {
        EXPECT_THAT(errorOf(run->bus(), planCall(run->bus(), changes)), testing::StartsWith(expected));
        EXPECT_THAT(errorOf(run->bus(), applyCall(run->bus(), changes)), testing::StartsWith(expected));
    }
    const double notANumber = std::numeric_limits<double>::quiet_NaN();
    const std::vector<PutOptions> badOptions = {
        [](bus::Writer& writer) { flag(writer, "no-such"); },
        [](bus::Writer& writer) { flag(writer, "verify-within"); },
        [](bus::Writer& writer) { seconds(writer, -1); },
        [](bus::Writer& writer) { seconds(writer, 61); },
        [notANumber](bus::Writer& writer) { seconds(writer, notANumber); },
        [](bus::Writer& writer) {
            writer.entry("sv", [&] { writer.put("force").variant("s", [&] { writer.put("yes"); }); });
        }};
    for (const PutOptions& options : badOptions) {
        EXPECT_THAT(errorOf(run->bus(), applyCall(run->bus(), {good}, options)),
                    testing::StartsWith(invalid));
    }
    EXPECT_FALSE(isInDiary("="));
    EXPECT_THAT(apply({}, [](bus::Writer&) {}).outcomes, ElementsAre());
    const Json empty = Json::parse(bus::Reader(run->bus().ask(planCall(run->bus(), {}), 60s)).text());
    EXPECT_EQ(empty["plan"]["changes"].size(), 0U);
}

/// The first one hangs in the plug-in: nothing of the second is done before its end, and everybody else is
/// answered meanwhile.
HOST_TEST_F(ServiceChanges, AtOnceWaitForEachOther) {
    host.file("/var/hold", "");
    std::optional<bus::Message> first;
    std::optional<bus::Message> second;
    const bus::Slot one = begin(applyCall(run->bus(), {{"computer", "115", {"hold"}},
                                                       {"ip-config:eth0", "DNSServers", {"192.0.2.1"}},
                                                       {"computer", "TimeZoneOffset", {"-60"}}}),
                                first);
    ASSERT_TRUE(call::until(run->bus(), [&] { return isInDiary("115=hold"); }));
    const bus::Slot other = begin(applyCall(run->bus(), {{"computer", "115", {"behind"}}}), second);
    for (int i = 0; i < 20; ++i) {
        EXPECT_EQ(call::get(run->bus(), ServiceRun::kComputer, "com.vantrel.Corvista1.Computer", "HostName"),
                  "fake");
    }
    EXPECT_FALSE(isInDiary("127="));
    EXPECT_FALSE(isInDiary("115=behind"));
    host.remove("/var/hold");
    ASSERT_TRUE(eventually([&] {
        run->bus().process();
        return first && second;
    }));
    EXPECT_FALSE(first->isError() || second->isError());
    EXPECT_LT(run->diary().find("127=-60"), run->diary().find("115=behind")) << run->diary();
}

/// What was begun goes on.
HOST_TEST_F(ServiceChanges, OfACallerWhoGoesAreMadeToTheEnd) {
    host.file("/var/hold", "");
    {
        bus::Connection gone(ServiceRun::address());
        gone.send(applyCall(gone, {{"computer", "115", {"hold"}}, {"computer", "TimeZoneOffset", {"-60"}}}));
        ASSERT_TRUE(call::until(gone, [&] { return isInDiary("115=hold"); }));
    }
    host.remove("/var/hold");
    EXPECT_TRUE(eventually([&] { return isInDiary("127=-60"); }));
}

bool isTriedOut(const FakeHost& host) {
    return std::ranges::any_of(host.listDirectory("/.proc"), [&host](const std::string& process) {
        return host.read("/.proc/" + process + "/comm").value_or("").starts_with("corvista-rehear");
    });
}

/// While they are tried out, a stop keeps them from being made, and waits for nothing.
HOST_TEST_F(ServiceChanges, ThatAreTriedOutAtAStopAreNotMade) {
    host.file("/var/hold", "");
    std::optional<bus::Message> answer;
    std::optional<bus::Message> planned;
    const auto nothing = [](bus::Writer&) {};
    const bus::Slot slot = begin(applyCall(run->bus(), {{"computer", "115", {"hold"}}}, nothing), answer);
    ASSERT_TRUE(call::until(run->bus(), [&] { return isTriedOut(host); }));
    const bus::Slot other = begin(planCall(run->bus(), {{"computer", "115", {"hold"}}}), planned);
    EXPECT_EQ(call::get(run->bus(), ServiceRun::kRoot, call::kAgent, "LastEvent"), "0");
    run->program().signal(SIGTERM);
    EXPECT_EQ(run->program().wait().status, 128 + SIGTERM);
    EXPECT_FALSE(isInDiary("="));
    EXPECT_THAT(run->diary(), HasSubstr("unload"));
}

/// The service with the real plug-in on a kernel's links; one interface has a file that is root's alone.
class ServicePlans : public LinkedHost {
protected:
    void setUpHost(FakeHost& host) override {
#if defined(__SANITIZE_THREAD__)
        GTEST_SKIP() << "the sanitizer's own thread keeps the program that tries changes from its fence";
#endif
        LinkedHost::setUpHost(host);
        host.file(file_, host.read(file_).value_or("") + "WPA_PSK=S3CR3T\n", 0600);
    }
    void serve(FakeHost& host) {
        run.emplace(host);
        run->plugin(CORVISTA_PLUGIN_FILE).hostTools("auto").start();
    }
    /// As the user whom the machine has for that, in the group or not.
    static std::string planAs(unsigned user, std::optional<unsigned> group = {}) {
        return call::asUser(user, group, [] {
            const bus::Connection own(ServiceRun::address());
            return bus::Reader(own.ask(planCall(own, kMove), 60s)).text();
        });
    }

    static inline const std::vector<Wanted> kMove = {
        {"ip-config:eth0", "IPv4Address", {"192.0.2.77"}},
        {"ip-config:eth0", "DNSServers", {"192.0.2.1", "2001:db8::1"}},
        {"computer", "OwnerContact", {"room 4"}},
        {"ip-config:eth0", "InterfaceState", {"12"}}};
    std::optional<ServiceRun> run;
};

HOST_TEST_F(ServicePlans, AreThoseByHand) {
    Json changes = Json::array();
    for (const Wanted& each : kMove) {
        changes.push_back({{"node", each.node}, {"property", each.property}, {"value", each.words}});
    }
    host.file("/root/changes", changes.dump());
    const Finished own =
        host.run({CVAGENT_PROGRAM, "--plugin", CORVISTA_PLUGIN_FILE, "plan", "/root/changes", "--json"});
    ASSERT_EQ(own.status, 0) << own.out << own.err;
    serve(host);
    EXPECT_EQ(planAs(0) + "\n", own.out);
    const Finished asked = host.run(
        {"env", "CORVISTA_BUS=" + ServiceRun::address(), CVAGENT_PROGRAM, "plan", "/root/changes", "--json"});
    EXPECT_EQ(asked.out, own.out);
    EXPECT_EQ(asked.err, own.err);
    EXPECT_EQ(asked.status, 0);
    EXPECT_THAT(host.read(file_).value_or(""), HasSubstr("IPADDR=192.0.2.10\n")) << "nothing was changed";
    EXPECT_EQ(Json::parse(own.out)["plan"]["answers"][3]["before"], "1") << "the host's, not the copy's";
}

/// What is refused, forced and told of a single change is the same, whoever makes it.
HOST_TEST_F(ServicePlans, GoWithASetThatIsTheSameAsByHand) {
    host.file("/root/change",
              R"([{"node": "ip-config:eth0", "property": "IPv4Gateway", "value": "203.0.113.1"}])");
    const std::vector<std::vector<std::string>> changes = {
        {"set", "ip-config:eth0", "IPv4Address", "192.0.2.255"},
        {"set", "ip-config:eth0", "IPv4Gateway", "203.0.113.1"},
        {"apply", "/root/change"},
        {"set", "ip-config:eth0", "IPv4Address", "192.0.2.255", "--force"},
        {"set", "ip-config:eth0", "IPv4Address", "192.0.2.10", "--verify-within", "0.1", "--json"}};
    std::vector<Finished> own;
    for (const auto& words : changes) {
        std::vector<std::string> line = {CVAGENT_PROGRAM, "--bus", "none", "--plugin", CORVISTA_PLUGIN_FILE};
        line.insert(line.end(), words.begin(), words.end());
        own.push_back(host.run(line));
    }
    serve(host);
    for (std::size_t i = 0; i < changes.size(); ++i) {
        std::vector<std::string> line = {"env", "CORVISTA_BUS=" + ServiceRun::address(), CVAGENT_PROGRAM};
        line.insert(line.end(), changes[i].begin(), changes[i].end());
        const Finished asked = host.run(line);
        EXPECT_EQ(asked.err, own[i].err);
        EXPECT_EQ(asked.out, own[i].out);
        EXPECT_EQ(asked.status, own[i].status);
        EXPECT_EQ(asked.status, i < 3 ? 4 : 0);
    }
}

/// Whom the service lets have a plan has root's, but for what only root may read.
HOST_TEST_F(ServicePlans, TellOthersNothingThatOnlyRootMayRead) {
    serve(host);
    const std::string roots = planAs(0);
    const std::string users = planAs(12345, 12345);
    if (users == "no other user") {
        GTEST_SKIP() << users;
    }
    EXPECT_THAT(roots, HasSubstr("S3CR3T"));
    EXPECT_THAT(users, Not(HasSubstr("S3CR3T")));
    Json root = Json::parse(roots);
    const Json user = Json::parse(users);
    std::vector<std::string> withheld;
    for (std::size_t i = 0; i < root["plan"]["files"].size(); ++i) {
        Json& own = root["plan"]["files"][i];
        if (user["plan"]["files"][i]["after"]["withheld"]) {
            withheld.push_back(own["path"]);
            own = user["plan"]["files"][i];
        }
    }
    EXPECT_THAT(withheld, ElementsAre(file_, "/opt/vantrel/corvista/data/asset.dat"));
    EXPECT_EQ(user, root) << "all else is the same";
}

}  // namespace
