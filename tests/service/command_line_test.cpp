// cvagent as a client of the service: the same answers as without it, and what goes wrong on the way.
#include <gmock/gmock.h>
#include <linux/sockios.h>
#include <net/if.h>
#include <signal.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstring>
#include <filesystem>
#include <nlohmann/json.hpp>

#include "agent/cli/failure.h"
#include "agent/cli/remote/client.h"
#include "tests/service/service_run.h"
#include "tests/support/waiting.h"

namespace {

using namespace std::chrono_literals;
using testing::HasSubstr;
using testing::StartsWith;
using Words = std::vector<std::string>;
using Json = nlohmann::json;

/// The command line of one who asks the service.
Words asking(const Words& words, const std::string& address = ServiceRun::address()) {
    Words line = {"env", "CORVISTA_BUS=" + address, QUICK_PROGRAM};
    line.insert(line.end(), words.begin(), words.end());
    return line;
}

/// The same question to an agent of the program's own.
Words byItself(const Words& words, const std::string& plugin) {
    Words line = {"env",
                  "CORVISTA_DATA_DIR=/var/own",
                  "CORVISTA_FAKE_PLUGIN_HOLD=/var/hold",
                  CVAGENT_PROGRAM,
                  "--host-tools",
                  "native",
                  "--plugin",
                  plugin};
    line.insert(line.end(), words.begin(), words.end());
    return line;
}

/// One agent holds the host's settings at a time, so the program's own answers first. What it writes itself
/// is gone with it: each question is about what no earlier one has written.
void expectSame(FakeHost& host, const std::vector<Words>& questions, const std::string& plugin) {
    std::vector<Finished> own;
    for (const Words& words : questions) {
        own.push_back(host.run(byItself(words, plugin)));
    }
    ServiceRun run(host);
    run.plugin(plugin).start();
    for (std::size_t i = 0; i < questions.size(); ++i) {
        const Finished asked = host.run(asking(questions[i]));
        const std::string what = testing::PrintToString(questions[i]);
        EXPECT_EQ(asked.out, own[i].out) << what;
        EXPECT_EQ(asked.err, own[i].err) << what;
        EXPECT_EQ(asked.status, own[i].status) << what;
    }
}

HOST_TEST(ServiceClient, AnswersAsAnAgentOfItsOwnDoes) {
    const std::vector<Words> questions = {
        {"tree"},
        {"tree", "--json"},
        {"get", "computer"},
        {"get", "computer", "--json"},
        {"get", "ip-config:eth0"},
        {"get", "ip-config:eth0", "--json"},
        {"get", "3", "127", "900", "108", "--json"},
        {"get", "computer", "108", "901"},
        {"get", "computer", "902", "903"},
        {"get", "computer", "912", "912"},
        {"get", "99"},
        {"get", "eth0"},
        {"get", "nowhere"},
        {"get", ""},
        {"get", "sda", "NoSuch"},
        {"get", "computer", "999"},
        {"get", "computer", "\xff"},
        {"get", "ip-config:eth0", "EnumeratePorts"},
        {"set", "computer", "HostName", "two words"},
        {"set", "computer", "CurrentTime", "yesterday"},
        {"set", "computer", "NoSuch", "1"},
        {"set", "ip-config:eth0", "DNSServers", "192.0.2.1", "nothing"},
        {"set", "nowhere", "HostName", "a"},
        {"set", "computer", "PowerAction", "9"},
        {"set", "ip-config:eth0", "DNSServers", "192.0.2.1", "2001:db8::1", "--json"},
        {"set", "computer", "OwnerName", "Zo\xc3\xab"},
        {"set", "computer", "OwnerContact", "throw"},
        {"set", "computer", "115", "room 4"},
        {"properties", "computer"}};
    expectSame(host, questions, FAKE_PLUGIN_FILE);
}

HOST_TEST(ServiceClient, AnswersTheSameOfARecordedHost) {
    host.copyTree("suse-two-nics");
    expectSame(host, {{"tree"}, {"get", "network-port:eth0", "--json"}, {"get", "ip-config:eth0"}},
               CORVISTA_PLUGIN_FILE);
}

HOST_TEST(ServiceClient, ExportsAndComparesAsAnAgentOfItsOwnDoes) {
    host.copyTree("suse-two-nics");
    host.file("/root/drift",
              R"([{"node": "ip-config:eth0", "property": "DNSServers", "value": "192.0.2.99"}])");
    expectSame(host,
               {{"export"},
                {"export", "ip-config:eth1"},
                {"diff", "/root/drift"},
                {"diff", "/root/drift", "--json"},
                {"diff", "/root/none"},
                {"apply", "/root/none"}},
               CORVISTA_PLUGIN_FILE);
}

HOST_TEST(ServiceClient, AppliesAFile) {
    ServiceRun run(host);
    run.start();
    host.file("/root/changes",
              R"([{"node": "computer", "property": "OwnerContact", "value": "room 4"},)"
              R"( {"node": "ip-config:eth0", "property": "DNSServers", "value": "192.0.2.9"}])");
    const Finished first = host.run(asking({"apply", "/root/changes", "--verify-within", "0"}));
    EXPECT_EQ(first.status, 0) << first.out << first.err;
    EXPECT_THAT(first.out, HasSubstr("applied    /oshw/root/computer OwnerContact  room 4\n"));
    const Finished second = host.run(asking({"apply", "/root/changes"}));
    EXPECT_EQ(second.status, 0) << second.out << second.err;
    EXPECT_THAT(second.out, testing::Not(HasSubstr("applied")));
}

/// The recorded host's links, with the kernel as well: soon after its start the service looks there, too.
void addToKernel(const std::vector<std::string>& links) {
    const int door = socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    for (const std::string& link : links) {
        ifreq named{};
        std::strcpy(named.ifr_name, link.c_str());
        EXPECT_EQ(ioctl(door, SIOCBRADDBR, named.ifr_name), 0);
        named.ifr_flags = IFF_UP;
        EXPECT_EQ(ioctl(door, SIOCSIFFLAGS, &named), 0);
    }
    close(door);
}

HOST_TEST(ServiceClient, TellsThePropertiesOfARecordedHost) {
    host.copyTree("suse-two-nics");
    addToKernel({"eth0", "eth1"});
    const auto nodes = [&host](const Words& line) {
        Json tree = Json::parse(host.run(line).out);
        for (Json& node : tree["nodes"]) {
            node["properties"].erase("126");  // the time
        }
        return tree;
    };
    const Json own = nodes(byItself({"tree", "--json"}, CORVISTA_PLUGIN_FILE));
    ServiceRun run(host);
    run.plugin(CORVISTA_PLUGIN_FILE).start();
    EXPECT_EQ(nodes(asking({"tree", "--json"})), own);
}

HOST_TEST(ServiceClient, ReadsTheNamesOfAPluginThatBringsThem) {
    ServiceRun run(host);
    run.plugin(HARDWARE_FILE).start();
    EXPECT_THAT(host.run(asking({"get", "memory"})).out, HasSubstr("TotalMemory"));
    EXPECT_THAT(host.run(asking({"get", "memory", "\xff"})).err,
                StartsWith("cvagent: a memory has no property '\\xff'"));
}

/// What the program that asks leaves to the whole one: other commands, and what is wrong.
HOST_TEST(ServiceClient, IsTheWholeProgramForAllElse) {
    ServiceRun run(host);
    run.start();
    const std::string bus = "CORVISTA_BUS=" + ServiceRun::address();
    for (const std::string words :
         {"--version", "properties computer", "get", "tree tree", "--json doctor -x",
          "get computer HostName >&-", "tree >&- 2>/dev/full", "tree <&-"}) {
        const Finished quick = host.run({"sh", "-c", bus + " exec " QUICK_PROGRAM " " + words});
        const Finished whole = host.run({"sh", "-c", bus + " exec " CVAGENT_PROGRAM " " + words});
        EXPECT_EQ(quick.out, whole.out) << words;
        EXPECT_EQ(quick.err, whole.err) << words;
        EXPECT_EQ(quick.status, whole.status) << words;
    }
    const Finished full = host.run({"sh", "-c", bus + " exec " QUICK_PROGRAM " tree >/dev/full"});
    EXPECT_EQ(full.err, host.run({"sh", "-c", bus + " exec " CVAGENT_PROGRAM " tree >/dev/full"}).err);
    EXPECT_EQ(full.status, 1);
}

/// The program that asks loads nothing that plug-ins are made of, and says what is missing where it is alone.
HOST_TEST(ServiceClient, NeedsTheWholeProgramBesideIt) {
    host.directory("/srv/bin");
    std::filesystem::copy_file(QUICK_PROGRAM, "/srv/bin/cvagent");
    const Finished alone = host.run({"/srv/bin/cvagent", "--version"});
    EXPECT_EQ(alone.status, 1);
    EXPECT_THAT(alone.err, testing::MatchesRegex(
                               "cvagent: cannot run '/.*/libexec/cvagent': No such file or directory\n"));
    const std::string libraries = host.run({"env", "LD_TRACE_LOADED_OBJECTS=1", QUICK_PROGRAM}).out;
    EXPECT_THAT(libraries, HasSubstr("libsystemd.so.0"));
    EXPECT_THAT(libraries, testing::Not(HasSubstr("libvantrelcvframework.so.1")));
}

HOST_TEST(ServiceClient, IsAnAgentOfItsOwnWhereNoServiceIs) {
    const auto tree = [&host](const Words& words) {
        Words line = asking({}, "unix:path=/nowhere");
        line.insert(line.end(), words.begin(), words.end());
        return host.run(line);
    };
    EXPECT_EQ(tree({"--plugin", FAKE_PLUGIN_FILE, "get", "computer", "HostName"}).err, "");
    const Finished named = host.run({CVAGENT_PROGRAM, "--bus", "unix:path=/nowhere", "get", "chassis"});
    EXPECT_THAT(named.err, StartsWith("cvagent: cannot reach the bus unix:path=/nowhere: No such file or "
                                      "directory; cvagent works by itself\n"));
    EXPECT_EQ(host.run({CVAGENT_PROGRAM, "--bus", "tcp:host=a", "tree"}).status, 2);
}

HOST_TEST(ServiceClient, AsksItNotWhenAnOptionIsForAnAgentOfItsOwn) {
    ServiceRun run(host);
    run.start();
    const Finished own =
        host.run({"env", "CORVISTA_BUS=" + ServiceRun::address(), "CORVISTA_DATA_DIR=/var/own",
                  CVAGENT_PROGRAM, "--plugin", FAKE_PLUGIN_FILE, "tree"});
    EXPECT_THAT(own.err, HasSubstr("another agent holds the data"));
    EXPECT_THAT(host.run(asking({"--bus", "none", "tree"})).err, HasSubstr("another agent holds the data"));
}

HOST_TEST(ServiceClient, FindsTheServicesOwnBus) {
    ServiceRun run(host);
    run.start();
    EXPECT_EQ(host.run({CVAGENT_PROGRAM, "get", "computer", "HostName"}).out,
              host.run(asking({"get", "computer", "HostName"})).out);
}

HOST_TEST(ServiceClient, ASetIsTheServicesWork) {
    ServiceRun run(host);
    run.start();
    host.run(asking({"set", "computer", "OwnerContact", "mine"}));
    EXPECT_THAT(run.diary(), HasSubstr("115=mine\n"));
    EXPECT_THAT(run.program().err(), HasSubstr("root (uid 0) wrote /oshw/root/computer OwnerContact: "));
}

/// cvagent as another user; what it prints of both kinds, and its status.
std::string asAlice(const Words& words) {
    return call::asUser(12345, {}, [&words] {
        std::string line;
        for (const std::string& word : words) {
            line += "'" + word + "' ";
        }
        std::string told(4096, '\0');
        FILE* const pipe = popen((line + "2>&1; echo status $?").c_str(), "r");
        told.resize(fread(told.data(), 1, told.size(), pipe));
        pclose(pipe);
        return told;
    });
}

HOST_TEST(ServiceClient, TellsWhatAUserMayNot) {
    ServiceRun run(host);
    run.start();
    if (call::asUser(12345, {}, [] { return std::string("yes"); }) != "yes") {
        GTEST_SKIP() << "there is no other user";
    }
    EXPECT_THAT(asAlice(asking({"get", "computer", "HostName"})), HasSubstr("HostName  fake\nstatus 0\n"));
    const std::string denied = asAlice(asking({"set", "computer", "OwnerName", "alice"}));
    EXPECT_THAT(denied, StartsWith("cvagent: the service does not allow it: "));
    EXPECT_THAT(denied, HasSubstr("status 4\n"));
    EXPECT_THAT(run.diary(), Not(HasSubstr("alice")));
}

HOST_TEST(ServiceClient, AUserFindsTheServiceOnHisOwnBus) {
    ServiceRun run(host);
    run.start();
    if (call::asUser(12345, {}, [] { return std::string("yes"); }) != "yes") {
        GTEST_SKIP() << "there is no other user";
    }
    host.directory("/run/alice/corvista", 0755);
    ASSERT_EQ(rename("/run/corvista/bus", "/run/alice/corvista/bus"), 0);
    const auto doctor = [](const std::string& place) {
        return Words{"env", "-u", "CORVISTA_BUS", "XDG_RUNTIME_DIR=" + place, CVAGENT_PROGRAM, "doctor"};
    };
    EXPECT_THAT(asAlice(doctor("/run/alice")), StartsWith("SERVICE\n  running, version "));
    for (const char* place : {"run/alice", "/run/alice/../al%69ce", ""}) {
        EXPECT_THAT(asAlice(doctor(place)), StartsWith("SERVICE\n  not running: ")) << place;
    }
    EXPECT_THAT(host.run(doctor("/run/alice")).out, StartsWith("SERVICE\n  not running: "));
}

HOST_TEST(ServiceClient, AReadWhoseServiceEndsIsMadeByItself) {
    ServiceRun run(host);
    run.start();
    host.file("/var/hold", "");
    RunningProgram get = host.start(asking({"get", "computer", "904"}));
    EXPECT_TRUE(eventually([&] { return host.exists("/var/hold.reached"); }));
    run.program().signal(SIGKILL);
    const Finished done = get.wait();
    EXPECT_THAT(done.err, HasSubstr("; cvagent looks by itself\n"));
    EXPECT_EQ(done.status, 3);
}

HOST_TEST(ServiceClient, AWriteWhoseServiceEndsIsNotMadeTwice) {
    ServiceRun run(host);
    run.start();
    host.file("/var/hold", "");
    RunningProgram set = host.start(asking({"set", "computer", "OwnerName", "hold"}));
    EXPECT_TRUE(eventually([&] { return run.diary().find("=hold") != std::string::npos; }));
    run.program().signal(SIGKILL);
    const Finished done = set.wait();
    EXPECT_EQ(done.status, 1);
    EXPECT_THAT(done.err,
                testing::EndsWith("; OwnerName may be changed, or not, or only in part: read it again\n"));
    EXPECT_EQ(done.out, "");
}

HOST_TEST(ServiceClient, TheDoctorTellsOfTheService) {
    EXPECT_THAT(host.run(asking({"doctor"})).out,
                StartsWith("SERVICE\n  not running: cvagent works by itself\n"));
    ServiceRun run(host);
    run.start();
    EXPECT_THAT(host.run(asking({"doctor"})).out,
                testing::ContainsRegex("SERVICE\n  running, version 1.0.0\n  since 20.*Z, last full "
                                       "look 20.*Z\n  read by everybody, written by root and the "
                                       "group corvista\n"));
    const auto report = nlohmann::json::parse(host.run(asking({"doctor", "--json"})).out)["service"];
    EXPECT_EQ(report["running"], true);
    EXPECT_EQ(report["problem"], nullptr);
    EXPECT_EQ(report["version"], "1.0.0");
    EXPECT_EQ(report["consent"], "group");
    EXPECT_THAT(report["since"].get<std::string>(), testing::MatchesRegex("20.*Z"));
    EXPECT_THAT(report["looked"].get<std::string>(), testing::MatchesRegex("20.*Z"));
}

/// A bus on which anybody may take any name, with somebody on it who took the service's.
class Impostor {
public:
    static constexpr const char* kAddress = "unix:path=/run/any";

    Impostor(FakeHost& host, unsigned user) : user_(user) {
        host.realTool("dbus-daemon");
        host.directory("/run", 0755);
        host.remove("/run/any");
        host.file("/etc/passwd", "root:x:0:0::/root:/bin/sh\nalice:x:12345:12345::/:/bin/sh\n");
        host.file(
            "/etc/any.conf",
            "<busconfig><listen>unix:path=/run/any</listen><auth>EXTERNAL</auth><policy context='default'>"
            "<allow user='*'/><allow own='*'/><allow send_destination='*' eavesdrop='true'/>"
            "<allow eavesdrop='true'/></policy></busconfig>");
        bus_.emplace(std::vector<std::string>{"dbus-daemon", "--config-file=/etc/any.conf", "--nofork"},
                     "/var/any");
        eventually([] {  // its socket is there before it listens
            try {
                const bus::Connection first(kAddress);
                return !first.uniqueName().empty();
            } catch (const bus::Error&) {
                return false;
            }
        });
    }
    ~Impostor() {
        if (child_ > 0) {
            kill(child_, SIGKILL);
            waitpid(child_, nullptr, 0);
        }
    }
    Impostor(const Impostor&) = delete;
    Impostor& operator=(const Impostor&) = delete;

    /// From now on somebody answers each call so.
    void answer(const std::function<void(bus::Connection&, const bus::Message&)>& answer) {
        child_ = fork();
        if (child_ == 0) {
            if (setuid(user_) == 0) {
                serve(answer);
            }
            _exit(0);
        }
        bus::Connection waiting(kAddress);
        eventually([&waiting] {
            return call::errorOf(waiting, "/", "a.b", "C").find("ServiceUnknown") == std::string::npos;
        });
    }

private:
    [[noreturn]] static void serve(const std::function<void(bus::Connection&, const bus::Message&)>& answer) {
        try {
            bus::Connection own(kAddress);
            own.acquireName("com.vantrel.Corvista1");
            const bus::Slot served = own.serve("/", [&](const bus::Message& call) { answer(own, call); });
            call::until(own, [] { return false; });
        } catch (const std::exception& exception) {
            std::fputs(exception.what(), stderr);
        }
        _exit(0);
    }

    unsigned user_;
    std::optional<RunningProgram> bus_;
    pid_t child_ = -1;
};

void answerWithText(bus::Connection& own, const bus::Message& call) {
    const bus::Message reply = call.reply();
    bus::Writer writer(reply);
    if (call.member() == "Get") {
        writer.variant("s", [&] { writer.put("9.9"); });
    } else {
        writer.put("a text");
    }
    own.send(reply);
}

HOST_TEST(ServiceClient, SaysWhichVersionItDoesNotUnderstand) {
    Impostor other(host, 0);
    other.answer(answerWithText);
    for (const Words& words :
         std::vector<Words>{{"tree"}, {"get", "computer"}, {"set", "computer", "OwnerName", "a"}}) {
        const Finished run = host.run(asking(words, Impostor::kAddress));
        EXPECT_EQ(run.status, 1);
        EXPECT_THAT(run.err,
                    StartsWith("cvagent: the service is version '9.9' and this is cvagent 1.0.0: they do not "
                               "understand each other\n"));
    }
}

HOST_TEST(ServiceClient, BelievesNoServiceOfAnotherUser) {
    Impostor other(host, 12345);
    other.answer(answerWithText);
    const Finished run = host.run(asking({"get", "chassis"}, Impostor::kAddress));
    EXPECT_THAT(
        run.err,
        StartsWith("cvagent: the service on the bus belongs to user 12345, neither root nor you, and is "
                   "not believed; cvagent works by itself\n"));
    EXPECT_EQ(run.status, 0);
}

HOST_TEST(ServiceClient, TellsWhatFailsInTheService) {
    const std::vector<std::pair<std::string, int>> errors = {{"com.vantrel.Corvista1.Error.Busy", 5},
                                                             {"com.vantrel.Corvista1.Error.New", 1},
                                                             {"org.freedesktop.DBus.Error.LimitsExceeded", 5},
                                                             {"org.freedesktop.DBus.Error.AccessDenied", 4},
                                                             {"org.freedesktop.DBus.Error.NoMemory", 1}};
    for (const auto& [name, status] : errors) {
        Impostor other(host, 0);
        other.answer([&](bus::Connection& own, const bus::Message& call) {
            own.send(call.errorReply(name, "no\x1b[2J"));
        });
        const Finished run = host.run(asking({"get", "computer"}, Impostor::kAddress));
        EXPECT_EQ(run.status, status) << name;
        EXPECT_THAT(run.err, HasSubstr("no\\x1b[2J")) << name;
    }
}

/// As a service answered that was made before it could make plans and several changes as one.
void answerAsBefore(bus::Connection& own, const bus::Message& call) {
    constexpr std::uint32_t kComputerType = 40;
    const bus::Message reply = call.reply();
    bus::Writer writer(reply);
    const auto reading = [&writer](const char* value) {
        writer.structure("uyvtus", [&] {
            writer.put(std::uint32_t{115}).put(std::uint8_t{2}).variant("s", [&] { writer.put(value); });
            writer.put(std::uint64_t{1}).put(std::uint32_t{0}).put("");
        });
    };
    if (call.member() == "Find") {
        writer.structure("uuuuosssu", [&] {
            writer.put(std::uint32_t{3}).put(std::uint32_t{2}).put(kComputerType).put(std::uint32_t{0});
            writer.putPath("/a").put("computer").put("/oshw/root/computer").put("Computer");
            writer.put(std::uint32_t{1});
        });
    } else if (call.member() == "Read") {
        writer.array("(uyvtus)", [&] { reading("old"); });
        writer.put(std::vector<std::string>());
    } else if (call.member() == "Write") {
        reading("old");
        reading("room 4");
        writer.put("applied").put(false).put("").put(std::vector<std::string>());
    } else {
        own.send(call.errorReply(bus::kUnknownMethod, "no such method"));
        return;
    }
    own.send(reply);
}

HOST_TEST(ServiceClient, ChangesByItselfThroughAServiceThatIsOlder) {
    Impostor other(host, 0);
    other.answer(answerAsBefore);
    const std::string told = "cvagent: the service is older than this cvagent";
    host.file("/root/changes", R"([{"node": "computer", "property": "OwnerContact", "value": "room 4"}])");
    const Finished set = host.run(asking({"set", "computer", "OwnerContact", "room 4"}, Impostor::kAddress));
    EXPECT_EQ(set.status, 0) << set.err;
    EXPECT_EQ(set.err, told + ": the changes are made by single writes\n");
    EXPECT_THAT(set.out, HasSubstr("    old  old\n    new  room 4\n"));
    const Finished apply = host.run(asking({"apply", "/root/changes", "--json"}, Impostor::kAddress));
    EXPECT_THAT(apply.err, StartsWith(told + ": the changes are made by single writes\n"));
    EXPECT_THAT(apply.out, HasSubstr("OwnerContact"));
    const Finished plan = host.run(asking({"plan", "/root/changes"}, Impostor::kAddress));
    EXPECT_THAT(plan.err, StartsWith(told + " and makes no plans\n"));
    const Finished get = host.run(asking({"get", "computer", "OwnerContact"}, Impostor::kAddress));
    EXPECT_EQ(get.status, 0) << get.err;
    EXPECT_EQ(get.out, "/oshw/root/computer [3]  Computer\n    115  OwnerContact  old\n");
}

/// Who may not have the service's plan gets one of his own, as far as he can see.
HOST_TEST(ServiceClient, PlansByItselfForWhomTheServiceDoesNot) {
    ServiceRun run(host);
    run.start();
    if (call::asUser(12345, {}, [] { return std::string("yes"); }) != "yes") {
        GTEST_SKIP() << "there is no other user";
    }
    EXPECT_THAT(asAlice(asking({"plan", "computer", "OwnerContact", "x"})),
                StartsWith("cvagent: the service does not let you have its plan: you may not plan "
                           "this: without polkit this is for root and the group corvista\n"
                           "cvagent: the plan is made as this user: "));
    EXPECT_THAT(asAlice(asking({"set", "computer", "OwnerContact", "x"})),
                StartsWith("cvagent: the service does not allow it: you may not apply this: "));
    EXPECT_EQ(run.diary().find('='), std::string::npos);
}

HOST_TEST(ServiceClient, AWriteWhoseServiceEndsBeforeIsNotMadeAtAll) {
    Impostor other(host, 0);
    other.answer([](bus::Connection& own, const bus::Message& call) {
        if (call.member() == "Find") {
            _exit(0);
        }
        answerWithText(own, call);
    });
    const Finished run = host.run(asking({"set", "computer", "OwnerName", "a"}, Impostor::kAddress));
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.err, testing::EndsWith("; nothing was done\n"));
    EXPECT_EQ(run.out, "");
}

HOST_TEST(ServiceClient, DoesNotWaitForAServiceThatHangs) {
    ServiceRun run(host);
    run.start();
    cvagent::remote::Client client(ServiceRun::address());
    EXPECT_EQ(client.textProperty("Version"), "1.0.0");
    run.program().signal(SIGSTOP);
    EXPECT_THROW(client.ask(client.call("Tree"), 1s), cvagent::Failure);
    run.program().signal(SIGCONT);
    client.ask(client.call("Tree"), cvagent::remote::Client::kShort);
}

/// The events of a watch that prints JSON.
std::vector<Json> eventsIn(const std::string& text) {
    std::vector<Json> events;
    std::istringstream in(text);
    for (std::string line; std::getline(in, line);) {
        events.push_back(Json::parse(line));
    }
    return events;
}

HOST_TEST(ServiceClient, AWatchGoesOnWhenTheServiceComesAgain) {
    ServiceRun run(host);
    run.start();
    const RunningProgram watch = host.start(asking({"watch", "--json"}));
    EXPECT_TRUE(eventually([&] { return watch.err().find("watching 11 nodes") != std::string::npos; }));
    for (const char* name : {"one", "two"}) {
        host.run(asking({"set", "computer", "OwnerContact", name}));
    }
    EXPECT_TRUE(watch.waitForOutput("\"two\"")) << watch.err() << run.program().err() << watch.out();
    run.program().signal(SIGKILL);
    EXPECT_TRUE(eventually([&] { return watch.err().find("waiting for the service") != std::string::npos; }));
    ServiceRun again(host);
    again.start();
    EXPECT_TRUE(
        eventually([&] { return watch.err().find("the service is there again") != std::string::npos; }));
    host.run(asking({"set", "computer", "OwnerContact", "three"}));
    EXPECT_TRUE(watch.waitForOutput("\"three\""));
    std::vector<std::string> after;
    for (const Json& event : eventsIn(watch.out())) {
        after.push_back(event["property"]["after"]);
    }
    EXPECT_THAT(after, testing::ElementsAre("one", "two", "three"));
}

HOST_TEST(ServiceClient, AWatchTellsAFloodOfEventsOnceEachInTheirOrder) {
    ServiceRun run(host);
    run.telling("churn").start();
    RunningProgram watch = host.start(asking({"watch", "--json", "--for", "1"}));
    const Finished done = watch.wait();
    EXPECT_EQ(done.status, 0);
    const std::vector<Json> events = eventsIn(done.out);
    ASSERT_GT(events.size(), 10U);
    for (std::size_t i = 1; i < events.size(); ++i) {
        ASSERT_EQ(events[i]["number"].get<int>(), events[i - 1]["number"].get<int>() + 1);
    }
}

/// Signals to one connection alone pass what it listens to.
void forgeEvents(const bus::Connection& bus) {
    for (int connection = 0; connection < 20; ++connection) {
        const bus::Message forged = bus.newSignal(ServiceRun::kRoot, call::kAgent, "Event");
        bus::Writer writer(forged);
        writer.structure("tstusssussssssau", [&] {
            writer.put(std::uint64_t{1}).put("alert").put(std::uint64_t{0}).put(std::uint32_t{0});
            writer.put("").put("/forged").put("forged").put(std::uint32_t{0});
            writer.put("").put("").put("").put("").put("").put("").put(std::vector<std::uint32_t>{1, 2, 3});
        });
        sd_bus_message_set_destination(forged.get(), (":1." + std::to_string(connection)).c_str());
        bus.send(forged);
    }
    bus.flush();
}

HOST_TEST(ServiceClient, AWatchBelievesNoOneElsesEvents) {
    ServiceRun run(host);
    run.start();
    const RunningProgram watch = host.start(asking({"watch", "--json"}));
    EXPECT_TRUE(eventually([&] { return watch.err().find("watching 11 nodes") != std::string::npos; }));
    host.run(asking({"set", "computer", "OwnerContact", "one"}));
    EXPECT_TRUE(watch.waitForOutput("\"after\""));  // it listens now
    forgeEvents(run.bus());
    host.run(asking({"set", "computer", "OwnerContact", "two"}));
    EXPECT_TRUE(eventually([&] { return eventsIn(watch.out()).size() == 2; }));
    EXPECT_THAT(watch.out(), Not(HasSubstr("forged")));
}

HOST_TEST(ServiceClient, AWatchRunsAProgramOnTheServicesAlerts) {
    host.file("/usr/bin/told", "#!/bin/sh\ncat >>/var/told\n", 0755);
    ServiceRun run(host);
    host.file("/var/hold", "");
    run.telling("heldalert").start();
    RunningProgram watch = host.start(asking({"watch", "--exec", "/usr/bin/told", "--for", "20"}));
    EXPECT_TRUE(eventually([&] { return watch.err().find("watching") != std::string::npos; }));
    host.remove("/var/hold");
    EXPECT_TRUE(eventually(
        [&] { return host.read("/var/told").value_or("").find("\"alert\"") != std::string::npos; }));
}

}  // namespace
