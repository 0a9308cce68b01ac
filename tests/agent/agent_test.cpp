// The agent itself: several plug-ins, many threads at once, hangs and deadlines.
#include "agent/core/agent.h"

#include <dlfcn.h>
#include <gmock/gmock.h>

#include <array>
#include <atomic>
#include <set>
#include <thread>

#include "agent/core/property_words.h"
#include "framework/cvlog/logger.h"
#include "tests/agent/suse_host.h"
#include "tests/support/fake_host.h"
#include "tests/support/waiting.h"

namespace {

using namespace std::chrono_literals;
using cvagent::Agent;
using cvagent::AgentSettings;
using cvagent::Event;
using cvagent::Freshness;
using cvagent::NodeRef;
using cvagent::Problem;
using cvagent::Reading;
using cvagent::Request;
using cvagent::WriteResult;
using testing::Each;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::StartsWith;

constexpr const char* kHold = "/tmp/hold";

AgentSettings settingsOf(const std::vector<std::string>& plugins) {
    AgentSettings settings;
    settings.plugins = plugins;
    settings.data = std::make_shared<cvagent::DataDirectory>();
    return settings;
}

/// An agent with the fake plug-in.
class Fake {
public:
    explicit Fake(const std::string& words = "") {
        setenv("CORVISTA_FAKE_PLUGIN", words.c_str(), 1);
        setenv("CORVISTA_FAKE_PLUGIN_HOLD", kHold, 1);
        settings.log = std::make_shared<cvagent::LogOutput>(cvagent::LogSettings(), errors);
        agent.emplace(settings);
    }
    Reading read(unsigned int id, const Request& request, Freshness freshness = Freshness::now) const {
        return agent->read(agent->find("computer"), {id}, freshness, request).front();
    }
    WriteResult write(const std::string& text, const Request& request, unsigned int id = 115) const {
        const NodeRef computer = agent->find("computer");
        return agent->write(computer, *cvagent::findProperty(40, id), IC::PropertyValue(text, true), request);
    }

    AgentSettings settings = settingsOf({FAKE_PLUGIN_FILE});
    std::shared_ptr<cvagent::ErrorLines> errors = std::make_shared<cvagent::ErrorLines>();
    std::optional<Agent> agent;
};

Request within(std::chrono::milliseconds time) {
    return Request("test", Request::Clock::now() + time);
}

/// A write that nobody waits for any more, and that hangs in the plug-in. One whose time is over before it
/// begins is never begun, and another one follows it.
WriteResult writeThatHangs(const Fake& fake, const FakeHost& host) {
    WriteResult result;
    while (!host.exists(std::string(kHold) + ".reached")) {
        try {
            result = fake.write("hold", within(50ms));
        } catch (const Problem& problem) {
            EXPECT_EQ(problem.kind(), Problem::busy);  // it is on its way to the plug-in
        }
    }
    return result;
}

std::vector<std::string> pathsOf(const Agent& agent) {
    std::vector<std::string> paths;
    for (const NodeRef& node : agent.nodes()) {
        paths.push_back(node->getPath());
    }
    return paths;
}

HOST_TEST(AgentNodes, ANodeRefKeepsThePluginAtWork) {
    Fake fake;
    std::optional<NodeRef> node = fake.agent->find("computer");
    fake.agent.reset();
    EXPECT_EQ((*node)->getDescription(), "Computer");
    EXPECT_NE(dlopen(FAKE_PLUGIN_FILE, RTLD_LAZY | RTLD_NOLOAD), nullptr);
    node.reset();
    void* const left = dlopen(FAKE_PLUGIN_FILE, RTLD_LAZY | RTLD_NOLOAD);  // the look above was a load
    ASSERT_NE(left, nullptr);
    dlclose(left);
    dlclose(left);
    EXPECT_EQ(dlopen(FAKE_PLUGIN_FILE, RTLD_LAZY | RTLD_NOLOAD), nullptr);
}

HOST_TEST(AgentNodes, AReferenceCanBeGivenANodeOfAnotherAgent) {
    const cvagent::QuietCommands quiet;
    AgentSettings settings = settingsOf({FAKE_PLUGIN_FILE});
    auto first = std::make_unique<Agent>(settings);
    NodeRef node = first->find("computer");
    first.reset();
    settings.plugins = {CORVISTA_PLUGIN_FILE};
    {
        const Agent second(settings);
        node = second.find("computer");  // the last one of the first agent goes here
    }
    EXPECT_EQ(node->getDescription(), "Computer");
}

HOST_TEST(AgentPlugins, HaveIdsThatNeverMeetInOneTree) {
    const cvagent::QuietCommands quiet;
    host.file("/proc/cpuinfo", "processor\t: 0\n");
    setenv("CORVISTA_FAKE_PLUGIN", "churn", 1);
    const Agent agent(settingsOf({CORVISTA_PLUGIN_FILE, FAKE_PLUGIN_FILE}));
    EXPECT_THAT(agent.plugins(), ElementsAre(CORVISTA_PLUGIN_FILE, FAKE_PLUGIN_FILE));
    EXPECT_THAT(agent.failedPlugins(), IsEmpty());
    std::set<unsigned int> ids;
    std::size_t tops = 0;
    const auto nodes = agent.nodes();
    for (const NodeRef& node : nodes) {
        ids.insert(node->getNodeId());
        tops += node->getLinkedId() == 0 ? 1 : 0;
    }
    EXPECT_EQ(ids.size(), nodes.size());
    EXPECT_EQ(tops, 2U);
    EXPECT_EQ(nodes.front()->getNodeId(), 1U);
    const NodeRef top = agent.find("100000001");
    EXPECT_EQ(top->nodeType(), 38U);
    const NodeRef port = agent.find("network-port:eth0");
    EXPECT_EQ(port->getMIIds(), std::vector<unsigned int>{2});
    EXPECT_EQ(port->getPath(), "/oshw/root/computer/chassis/network-controller/network-port:eth0");
}

HOST_TEST(AgentPlugins, AskForNodesByNameOfTheirOwnFirst) {
    const cvagent::QuietCommands quiet;
    host.file("/proc/cpuinfo", "processor\t: 0\n");
    setenv("CORVISTA_FAKE_PLUGIN", "find", 1);
    setenv("CORVISTA_FAKE_PLUGIN_DIARY", "/tmp/diary", 1);
    { const Agent agent(settingsOf({CORVISTA_PLUGIN_FILE, FAKE_PLUGIN_FILE})); }
    EXPECT_THAT(*host.read("/tmp/diary"), HasSubstr("initialize 2 100000001 100000002\n"));
    EXPECT_THAT(*host.read("/tmp/diary"), HasSubstr("\nhard-drive:sda: Hard Drive\n"));
    EXPECT_THAT(*host.read("/tmp/diary"), HasSubstr("\nat the end: no plug-in is loaded\n"));
}

HOST_TEST(AgentPlugins, OneThatFailsCostsNothingOfTheOthers) {
    const cvagent::QuietCommands quiet;
    for (const std::string word : {"fail", "badstart", "throwstart", "foreignids"}) {
        setenv("CORVISTA_FAKE_PLUGIN", word.c_str(), 1);
        const Agent agent(settingsOf({CORVISTA_PLUGIN_FILE, FAKE_PLUGIN_FILE, "/nowhere.so"}));
        ASSERT_EQ(agent.failedPlugins().size(), 2U) << word;
        EXPECT_EQ(agent.failedPlugins().front().file, FAKE_PLUGIN_FILE);
        EXPECT_EQ(agent.failedPlugins().back().problem.subject(), Problem::pluginFile);
        EXPECT_THAT(pathsOf(agent), testing::Contains("/oshw/root/computer"));
    }
    EXPECT_THROW(Agent(settingsOf({"/nowhere.so"})), Problem);
}

HOST_TEST(AgentPlugins, NothingIsToldOfOneThatDoesNotStart) {
    const cvagent::QuietCommands quiet;
    host.file("/proc/cpuinfo", "processor\t: 0\n");
    const auto pathsAndEvents = [](const std::string& words) {
        setenv("CORVISTA_FAKE_PLUGIN", words.c_str(), 1);
        const Agent agent(settingsOf({CORVISTA_PLUGIN_FILE, FAKE_PLUGIN_FILE}));
        std::vector<std::string> events;
        for (const Event& event : agent.subscribe(0)->take().events) {
            events.push_back(eventName(event.kind) + (" " + event.path));
        }
        return std::pair(pathsOf(agent), events);
    };
    const std::string drive = "/oshw/root/computer/chassis/planar/disk-controller/hard-drive:sdc";
    const std::string port = "/oshw/root/computer/chassis/network-controller/network-port:eth0";
    EXPECT_THAT(pathsAndEvents("early publish").second, ElementsAre("alert " + port, "published " + drive));
    const auto failed = pathsAndEvents("early publish late badstart");
    EXPECT_THAT(failed.second, IsEmpty());
    EXPECT_THAT(failed.first, testing::Not(testing::Contains(HasSubstr("hard-drive"))));
}

// At its end the program goes though nobody has joined a thread, which ThreadSanitizer reports.
#if !defined(__SANITIZE_THREAD__)
HOST_TEST(AgentPlugins, OneThatTakesTooLongToStartIsLeftToItself) {
    const cvagent::QuietCommands quiet;
    host.file("/proc/cpuinfo", "processor\t: 0\n");
    host.file(kHold, "");
    setenv("CORVISTA_FAKE_PLUGIN", "holdstart early publish", 1);
    setenv("CORVISTA_FAKE_PLUGIN_HOLD", kHold, 1);
    setenv("CORVISTA_FAKE_PLUGIN_DIARY", "/tmp/diary", 1);
    AgentSettings settings = settingsOf({FAKE_PLUGIN_FILE, CORVISTA_PLUGIN_FILE});
    settings.startTime = 60ms;
    std::vector<std::string> told;
    settings.tell = [&told](const std::string& text) { told.push_back(text); };
    const std::size_t threads = runningThreads();
    std::shared_ptr<cvagent::Subscription> events;
    {
        const Agent agent(settings);
        ASSERT_EQ(agent.failedPlugins().size(), 1U);
        EXPECT_THAT(agent.failedPlugins().front().problem.what(), HasSubstr("has not started after 1 s"));
        EXPECT_THAT(told, ElementsAre(HasSubstr("waiting for the plug-in '/")));
        EXPECT_THAT(agent.plugins(), ElementsAre(CORVISTA_PLUGIN_FILE));
        EXPECT_THAT(pathsOf(agent), testing::Contains("/oshw/root/computer"));
        events = agent.subscribe(0);
    }
    host.remove(kHold);  // it comes back when there is no agent any more
    EXPECT_TRUE(eventually([threads] { return runningThreads() == threads; }));
    EXPECT_THAT(*host.read("/tmp/diary"), testing::EndsWith("held no more\n")) << "it is not stopped";
    EXPECT_THAT(events->take().events, IsEmpty());
}
#endif

HOST_TEST(AgentPlugins, AreLoadedWithADataDirectoryOnly) {
    AgentSettings settings = settingsOf({FAKE_PLUGIN_FILE});
    settings.data = nullptr;
    EXPECT_THROW(Agent{settings}, std::invalid_argument);
}

HOST_TEST(AgentPlugins, TheSameOneTwiceIsRefused) {
    const Agent agent(settingsOf({FAKE_PLUGIN_FILE, FAKE_PLUGIN_FILE}));
    ASSERT_EQ(agent.failedPlugins().size(), 1U);
    EXPECT_EQ(agent.failedPlugins().front().problem.kind(), Problem::refused);
    EXPECT_THAT(agent.nodes(), testing::SizeIs(testing::Gt(5U)));
}

HOST_TEST(AgentErrors, BelongToTheRequestThatCausedThem) {
    Fake fake("churn chatter");
    std::atomic<int> wrong{0};
    const auto ask = [&](unsigned int id) {
        const std::string own = "read of " + std::to_string(id) + " [fake]";
        for (int i = 0; i < 100; ++i) {
            const Request request("test");
            fake.read(id, request);
            const auto taken = request.errors().take();
            wrong += taken.texts == std::vector<std::string>{own} ? 0 : 1;
        }
    };
    {
        std::vector<std::jthread> askers;
        for (unsigned int id = 910; id < 914; ++id) {
            askers.emplace_back(ask, id);
        }
    }
    EXPECT_EQ(wrong, 0);
    fake.agent.reset();
    const auto others = fake.errors->take();
    ASSERT_EQ(others.texts.size(), 1U);
    EXPECT_THAT(others.texts.front(), testing::StartsWith("the monitor's own [fake]"));
}

HOST_TEST(AgentReads, WhatHangsIsStaleInTimeAndNothingElseIsLate) {
    Fake fake;
    EXPECT_EQ(static_cast<unsigned int>(fake.read(904, Request("test")).value), 1U);
    host.file(kHold, "");
    const auto start = std::chrono::steady_clock::now();
    const NodeRef drive = fake.agent->find("hard-drive:sda");
    for (int i = 0; i < 10; ++i) {  // again and again, more often than there are threads
        const std::vector<unsigned int> ids(10, 904);
        for (const Reading& reading :
             fake.agent->read(fake.agent->find("computer"), ids, Freshness::now, within(20ms))) {
            EXPECT_TRUE(reading.stale && reading.timedOut && reading.failed());
            EXPECT_EQ(static_cast<unsigned int>(reading.value), 1U);
        }
        const Reading other = fake.agent->read(drive, {89}, Freshness::now, within(5s)).front();
        EXPECT_FALSE(other.failed());
        EXPECT_FALSE(other.stale);
    }
    EXPECT_LT(std::chrono::steady_clock::now() - start, 5s);
    const Reading known = fake.read(904, Request("test"), Freshness::known);
    EXPECT_TRUE(known.stale);
    EXPECT_GE(std::chrono::steady_clock::now() - *known.asOf, 200ms);
    host.remove(kHold);
    const Reading now = fake.read(904, within(5s));
    EXPECT_FALSE(now.failed() || now.stale);
    EXPECT_GT(static_cast<unsigned int>(now.value), 1U);
    EXPECT_LT(static_cast<unsigned int>(now.value), 20U);  // what nobody waits for is not begun
}

HOST_TEST(AgentReads, WhatADeviceDoesNotAnswerIsTheLastValueMarkedStale) {
    Fake fake;
    host.file(kHold, "");
    const Reading never = fake.read(905, Request("test"));
    EXPECT_TRUE(never.timedOut && never.failed());
    EXPECT_TRUE(never.value.empty());
    host.remove(kHold);
    EXPECT_EQ(static_cast<unsigned int>(fake.read(905, Request("test")).value), 1U);
    host.file(kHold, "");
    const Reading stale = fake.read(905, Request("test"));
    EXPECT_TRUE(stale.timedOut && stale.stale && !stale.missing);
    EXPECT_EQ(stale.error, "the device does not answer");
    EXPECT_EQ(static_cast<unsigned int>(stale.value), 1U);
    EXPECT_TRUE(fake.read(905, Request("test"), Freshness::known).stale);
    host.remove(kHold);
    const Reading now = fake.read(905, Request("test"));
    EXPECT_FALSE(now.failed() || now.stale);
    EXPECT_EQ(static_cast<unsigned int>(now.value), 2U);
}

HOST_TEST(AgentReads, AnyNumberOfNodesThatHangMakesNothingElseLate) {
    Fake fake("drives");
    host.file(kHold, "");
    const NodeRef computer = fake.agent->find("computer");
    std::vector<NodeRef> stuck;
    for (int i = 0; i < 20; ++i) {
        stuck.push_back(fake.agent->find("hard-drive:x" + std::to_string(i)));
    }
    const std::vector<unsigned int> ids(10, 904);
    for (int round = 0; round < 3; ++round) {
        for (const NodeRef& node : stuck) {
            EXPECT_THAT(fake.agent->read(node, ids, Freshness::now, within(round == 0 ? 50ms : 5ms)),
                        Each(testing::Field(&Reading::timedOut, true)));
        }
        const auto start = std::chrono::steady_clock::now();
        EXPECT_FALSE(fake.agent->read(computer, {108}, Freshness::now, within(5s)).front().failed());
        EXPECT_LT(std::chrono::steady_clock::now() - start, 3s);
    }
    // Once a node has hung for long its readings are stale at once.
    std::this_thread::sleep_for(1s);
    const auto start = std::chrono::steady_clock::now();
    for (const NodeRef& node : stuck) {
        const Reading reading = fake.agent->read(node, {89}, Freshness::now, within(5s)).front();
        EXPECT_TRUE(reading.stale && reading.timedOut);
        EXPECT_THAT(static_cast<std::string>(reading.value), testing::StartsWith("/dev/x"));
    }
    EXPECT_LT(std::chrono::steady_clock::now() - start, 3s);
    host.remove(kHold);
    EXPECT_FALSE(fake.agent->read(stuck.front(), {89}, Freshness::now, Request("test")).front().failed());
}

HOST_TEST(AgentReads, TwentyNodesThatHangAtOnceMakeNothingElseLate) {
    Fake fake("drives");
    host.file(kHold, "");
    std::vector<std::jthread> askers;
    for (int i = 0; i < 20; ++i) {
        askers.emplace_back([&fake, i] {
            const NodeRef node = fake.agent->find("hard-drive:x" + std::to_string(i));
            fake.agent->read(node, std::vector<unsigned int>(10, 904), Freshness::now, within(3s));
        });
    }
    std::this_thread::sleep_for(20ms);
    EXPECT_FALSE(fake.read(108, within(2500ms)).failed());
    host.remove(kHold);
}

HOST_TEST(AgentReads, OneThatNobodyWaitsForAsksNobody) {
    Fake fake;
    const Reading reading = fake.read(904, Request("test", Request::Clock::time_point()));
    EXPECT_TRUE(reading.timedOut && reading.failed());
    EXPECT_EQ(static_cast<unsigned int>(fake.read(904, Request("test")).value), 1U);
}

HOST_TEST(AgentReads, TheAgentMayGoWhileTheyHang) {
    Fake fake;
    host.file(kHold, "");
    fake.read(904, within(10ms));
    std::jthread end([&fake] { fake.agent.reset(); });
    std::this_thread::sleep_for(20ms);
    host.remove(kHold);
    end.join();
    EXPECT_EQ(dlopen(FAKE_PLUGIN_FILE, RTLD_LAZY | RTLD_NOLOAD), nullptr);
}

HOST_TEST(AgentWrites, OneThatNobodyWaitsForChangesNothing) {
    Fake fake;
    const WriteResult late = fake.write("late", Request("test", Request::Clock::time_point()));
    ASSERT_TRUE(late.problem);
    EXPECT_STREQ(late.problem->what(), "OwnerContact was not changed: no answer in time");
    EXPECT_EQ(static_cast<std::string>(fake.read(115, Request("test")).value), "");
}

HOST_TEST(AgentWrites, NobodyWaitsForEverForOneThatHangs) {
    Fake fake;
    host.file(kHold, "");
    EXPECT_TRUE(writeThatHangs(fake, host).problem);
    try {
        fake.write("second", Request("test"));
        ADD_FAILURE() << "two writes at once";
    } catch (const Problem& problem) {
        EXPECT_EQ(problem.kind(), Problem::busy);
    }
    host.remove(kHold);
    EXPECT_EQ(fake.write("third", within(5s)).outcome, WriteResult::applied);
}

HOST_TEST(AgentReads, WhatIsKnownAsksNobody) {
    host.file(kHold, "");
    Fake fake;
    EXPECT_EQ(static_cast<std::string>(fake.read(108, Request("test"), Freshness::known).value), "fake");
    EXPECT_TRUE(fake.read(904, Request("test"), Freshness::known).failed());
    host.remove(kHold);
}

/// The kernel numbers threads and processes in one sequence.
pid_t idOfANewThread() {
    pid_t id = 0;
    std::jthread([&id] { id = gettid(); }).join();
    return id;
}

HOST_TEST(AgentThreads, AreNotMadeForEachCall) {
    Fake fake;
    const pid_t before = idOfANewThread();
    for (int i = 0; i < 100; ++i) {
        fake.read(108, i % 2 == 0 ? Request("test") : within(5s));
        fake.write("x", Request("test"));
    }
    EXPECT_LT(idOfANewThread() - before, 100) << "no more than the pool has";
}

HOST_TEST(AgentWrites, TellWhatCameOfThem) {
    Fake fake;
    const Request request("test");
    const WriteResult good = fake.write("room 5", request);
    EXPECT_EQ(good.outcome, WriteResult::applied);
    EXPECT_FALSE(good.problem);
    EXPECT_EQ(static_cast<std::string>(good.before.value), "");
    EXPECT_EQ(static_cast<std::string>(good.after.value), "room 5");
    EXPECT_THAT(request.errors().take().texts, ElementsAre("the disk is nearly full [fake]"));
    const WriteResult bad = fake.write("somebody", request, 116);
    ASSERT_TRUE(bad.problem);
    EXPECT_EQ(bad.problem->kind(), Problem::failed);
    EXPECT_EQ(bad.outcome, WriteResult::notKnown);
    const auto events = fake.agent->subscribe(0)->take().events;
    ASSERT_EQ(events.size(), 2U);
    EXPECT_EQ(events[0].kind, Event::Kind::written);
    EXPECT_EQ(events[0].path, "/oshw/root/computer");
    EXPECT_EQ(events[0].propertyName, "OwnerContact");
    EXPECT_EQ(events[0].after, "room 5");
    EXPECT_EQ(events[0].caller, "test");
    EXPECT_EQ(events[0].wanted, "room 5");
    EXPECT_EQ(events[0].verdict, "applied: the plug-in reported errors");
    EXPECT_EQ(events[1].kind, Event::Kind::written);
    EXPECT_EQ(events[1].after, "");
    EXPECT_EQ(events[1].wanted, "somebody");
    EXPECT_THAT(events[1].verdict, StartsWith("failed: OwnerName was not changed: "));
}

HOST_TEST(AgentWrites, NodesThatAWriteMadeAppearAreTold) {
    Fake fake("churn");
    const NodeRef ip = fake.agent->find("ip-config:eth0");
    const WriteResult result = fake.agent->write(ip, *cvagent::findProperty(29, 74),
                                                 IC::PropertyValue(IC::Number(1U), true), Request("test"));
    EXPECT_EQ(result.outcome, WriteResult::notKnown);
    std::vector<std::string> told;
    for (const Event& event : fake.agent->subscribe(0)->take().events) {
        if (event.path.find("hard-drive") == std::string::npos) {
            told.push_back(eventName(event.kind) + (" " + event.path));
        }
    }
    const std::string above =
        "/oshw/root/computer/chassis/network-controller/network-port:eth0/ip-config:eth0";
    EXPECT_THAT(told, ElementsAre("published " + above + "/network-port:eth1", "written " + above));
}

HOST_TEST(AgentWrites, ReadsGoOnBesideAWriteAndAnotherWriteWaits) {
    Fake fake;
    host.file(kHold, "");
    const WriteResult hanging = writeThatHangs(fake, host);
    ASSERT_TRUE(hanging.problem);
    EXPECT_EQ(hanging.problem->kind(), Problem::timedOut);
    EXPECT_EQ(hanging.outcome, WriteResult::notKnown);
    EXPECT_FALSE(fake.read(108, within(5s)).failed());
    try {
        fake.write("second", within(50ms));
        ADD_FAILURE() << "two writes at once";
    } catch (const Problem& problem) {
        EXPECT_EQ(problem.kind(), Problem::busy);
    }
    host.remove(kHold);
    const WriteResult second = fake.write("second", within(5s));
    EXPECT_EQ(static_cast<std::string>(second.before.value), "hold");
    EXPECT_EQ(second.outcome, WriteResult::applied);
}

/// One of two writers of the same interface file.
void writeAgain(const Agent& agent, unsigned int id, const std::string& word, std::string& told) {
    const NodeRef node = agent.find("ip-config:eth0");
    const auto row = cvagent::findProperty(node->nodeType(), id);
    const Request request("test");
    const WriteResult result = agent.write(node, *row, cvagent::acceptedValue(*row, {word}), request);
    told = result.problem ? result.problem->what() : "";
    for (const std::string& error : request.errors().take().texts) {
        told += "\n" + error;
    }
}

#ifdef __SANITIZE_THREAD__
constexpr int kRounds = 20;  // each takes four times as long
#else
constexpr int kRounds = 100;
#endif

/// CORVISTA_TEST_ROUNDS asks for more rounds. The file is long, so that what a writer holds of it is soon not
/// what stands there.
HOST_TEST(AgentWrites, TwoWritersOfOneFileLoseNothing) {
    const char* const asked = std::getenv("CORVISTA_TEST_ROUNDS");
    const int rounds = asked != nullptr ? std::atoi(asked) : kRounds;
    SuseHost suse(host);
    std::string before = suse.read(SuseHost::kInterfaceFile);
    for (int i = 0; i < 8000; ++i) {
        before += "# a line that nobody changes\n";
    }
    host.file(SuseHost::kInterfaceFile, before);
    host.tool("ifconfig %any", "");
    const cvagent::QuietCommands quiet;
    const Agent agent(settingsOf({CORVISTA_PLUGIN_FILE}));
    int lost = 0;
    for (int round = 1; round <= rounds; ++round) {
        const std::string address = "192.0.2." + std::to_string(1 + round % 200);
        const std::string mask = round % 2 == 0 ? "255.255.0.0" : "255.255.255.128";
        std::array<std::string, 2> told;
        {
            const std::jthread first(writeAgain, std::cref(agent), 25, address, std::ref(told[0]));
            const std::jthread second(writeAgain, std::cref(agent), 26, mask, std::ref(told[1]));
        }
        const std::string file = suse.read(SuseHost::kInterfaceFile);
        const bool whole = file.find("IPADDR=" + address + "\n") != std::string::npos &&
                           file.find("NETMASK=" + mask + "\n") != std::string::npos;
        lost += whole ? 0 : 1;
        if (!whole && lost == 1) {
            ADD_FAILURE() << "round " << round << " of " << rounds << ", " << address << " " << mask << "\n"
                          << file.substr(0, 150) << told[0] << told[1];
        }
    }
    EXPECT_EQ(lost, 0) << "of " << rounds << " rounds";
}

HOST_TEST(AgentThreads, SixtyFourReadWhileNodesComeAndGo) {
    Fake fake("churn alert");
    const auto deaf = fake.agent->subscribe(0);  // never read
    std::atomic<int> read{0};
    {
        std::vector<std::jthread> readers;
        for (int i = 0; i < 64; ++i) {
            readers.emplace_back([&fake, &read, i] {
                for (int round = 0; round < 3; ++round) {
                    const auto nodes = fake.agent->nodes();
                    const NodeRef& node = nodes[static_cast<std::size_t>(i) % nodes.size()];
                    const auto deadline = i % 2 == 0 ? within(5s) : Request("test");
                    read += fake.agent->read(node, {89, 108}, Freshness::now, deadline).size() == 2 ? 1 : 0;
                    fake.agent->subscribe(0, Event::Kind::alert)->take();
                }
            });
        }
    }
    EXPECT_EQ(read, 64 * 3);
}

HOST_TEST(AgentThreads, EverythingAtOnce) {
    Fake fake("churn alert chatter");
    const auto all = fake.agent->subscribe(0);
    {
        std::vector<std::jthread> threads;
        const auto until = std::chrono::steady_clock::now() + 500ms;
        const auto repeat = [&](const auto& work) {
            threads.emplace_back([until, work] {
                while (std::chrono::steady_clock::now() < until) {
                    work();
                }
            });
        };
        for (int i = 0; i < 2; ++i) {
            repeat([&fake, i] { fake.write("x" + std::to_string(i), Request("test")); });
            repeat([&] {
                for (const NodeRef& node : fake.agent->nodes()) {
                    fake.agent->read(node, {89, 108, 910}, Freshness::now, within(20ms));
                }
            });
        }
        repeat([&] {
            const auto events = fake.agent->subscribe(0);
            fake.agent->read(fake.agent->find("computer"), {108}, Freshness::known, Request("test"));
            events->take();
            pathsOf(*fake.agent);
        });
    }
    fake.agent.reset();
    std::uint64_t last = 0;
    for (const Event& event : all->take().events) {
        EXPECT_GT(event.number, last);
        last = event.number;
    }
    EXPECT_GT(last, 0U);
}

}  // namespace
