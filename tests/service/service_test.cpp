// The service as a process: its start, its end, its configuration, its callers in masses.
#include <gmock/gmock.h>
#include <poll.h>
#include <signal.h>
#include <sys/socket.h>
#include <sys/un.h>

#include "tests/service/service_run.h"
#include "tests/support/waiting.h"

namespace {

using testing::ElementsAre;
using testing::HasSubstr;

HOST_TEST(Service, HelpsAndTellsItsVersion) {
    EXPECT_THAT(host.run({CVAGENTD_PROGRAM, "--help"}).out, HasSubstr("--private-bus"));
    EXPECT_EQ(host.run({CVAGENTD_PROGRAM, "--version"}).out, "cvagentd 1.0.0\n");
    EXPECT_EQ(host.run({CVAGENTD_PROGRAM, "--nonsense"}).status, 2);
    EXPECT_EQ(host.run({CVAGENTD_PROGRAM, "--private-bus", "--bus", "system"}).status, 2);
    const Finished nowhere =
        host.run({CVAGENTD_PROGRAM, "--bus", "unix:path=/nowhere", "--plugin", FAKE_PLUGIN_FILE});
    EXPECT_EQ(nowhere.status, 1);
    EXPECT_EQ(nowhere.err, "cvagentd: cannot reach the bus unix:path=/nowhere: No such file or directory\n");
}

HOST_TEST(Service, ChecksItsConfiguration) {
    EXPECT_EQ(host.run({CVAGENTD_PROGRAM, "--check"}).status, 0);
    host.file("/etc/corvista/agent.conf", "look-every = 30\nlook = 1\n");
    const Finished wrong = host.run({CVAGENTD_PROGRAM, "--check"});
    EXPECT_EQ(wrong.status, 2);
    EXPECT_EQ(wrong.err, "cvagentd: /etc/corvista/agent.conf: line 2: there is no key 'look'\n");
    host.file("/etc/other.conf", "look-every = 30\n");
    EXPECT_EQ(host.run({CVAGENTD_PROGRAM, "--check", "--config", "/etc/other.conf"}).status, 0);
    EXPECT_EQ(host.run({CVAGENTD_PROGRAM, "--check", "--config", "/etc/none.conf"}).status, 1);
}

HOST_TEST(Service, DoesNotStartWithAWrongConfiguration) {
    ServiceRun run(host);
    run.config("nonsense\n");
    EXPECT_EQ(host.run(run.commandLine()).status, 2);
}

HOST_TEST(Service, KeepsWhatItHadWhenTheConfigurationIsWrong) {
    ServiceRun run(host);
    run.config("look-every = 100\n").start();
    host.file("/etc/corvista/agent.conf", "\n\nlook-every = soon\n");
    run.program().signal(SIGHUP);
    EXPECT_TRUE(eventually([&] { return run.program().err().find("stays as it was") != std::string::npos; }));
    EXPECT_THAT(run.program().err(), HasSubstr("agent.conf: line 3: look-every is 'soon'"));
    host.file("/etc/corvista/agent.conf", "look-every = 200\n");
    run.program().signal(SIGHUP);
    EXPECT_TRUE(eventually([&] { return run.program().err().find("read again") != std::string::npos; }));
    EXPECT_EQ(call::get(run.bus(), ServiceRun::kRoot, call::kAgent, "Version"), "1.0.0");
}

HOST_TEST(Service, IsOneOnABus) {
    ServiceRun run(host);
    run.start();
    const Finished second = host.run({"env", "CORVISTA_DATA_DIR=/var/second", CVAGENTD_PROGRAM, "--bus",
                                      ServiceRun::address(), "--plugin", FAKE_PLUGIN_FILE});
    EXPECT_EQ(second.status, 5);
    EXPECT_EQ(second.err, "cvagentd: another agent is on this bus already: process " +
                              std::to_string(run.program().pid()) + "\n");
    const Finished sameBus = host.run({CVAGENTD_PROGRAM, "--private-bus", "--plugin", FAKE_PLUGIN_FILE});
    EXPECT_EQ(sameBus.status, 5);
    EXPECT_EQ(sameBus.err, "cvagentd: another cvagentd has a bus of its own in '/run/corvista'\n");
}

HOST_TEST(Service, EndsInOrder) {
    ServiceRun run(host);
    run.start();
    EXPECT_THAT(host.listDirectory("/run/corvista"), ElementsAre(".lock", "bus", "bus.conf"));
    run.program().signal(SIGTERM);
    EXPECT_EQ(run.program().wait().status, 128 + SIGTERM);
    EXPECT_THAT(run.diary(), HasSubstr("unload"));
    EXPECT_THAT(host.listDirectory("/run/corvista"), ElementsAre(".lock"));
}

/// After kill -9 the bus is gone, too, and the next one starts as if nothing had been.
HOST_TEST(Service, StartsAgainAfterAnEndByForce) {
    for (int round = 0; round < 3; ++round) {
        ServiceRun run(host);
        run.start();
        run.program().signal(SIGKILL);
        run.program().wait();
        EXPECT_TRUE(eventually([&] {
            try {
                const bus::Connection none(ServiceRun::address());
                none.uniqueName();
                return false;
            } catch (const bus::Error&) {
                return true;
            }
        }));
    }
}

HOST_TEST(Service, EndsWithItsBus) {
    ServiceRun run(host);
    run.start();
    const Finished found = host.run({"sh", "-c",
                                     "cat /proc/" + std::to_string(run.program().pid()) + "/task/" +
                                         std::to_string(run.program().pid()) + "/children"});
    kill(static_cast<pid_t>(std::stol(found.out)), SIGKILL);
    const Finished ended = run.program().wait();
    EXPECT_EQ(ended.status, 1);
    EXPECT_THAT(ended.err, HasSubstr("cvagentd: the bus is gone"));
}

/// What a service manager is told.
HOST_TEST(Service, TellsItsManagerHowItIs) {
    const int manager = socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    sockaddr_un address{AF_UNIX, "/run/notify"};
    ServiceRun run(host);
    ASSERT_EQ(bind(manager, reinterpret_cast<sockaddr*>(&address), sizeof(address)), 0);
    setenv("NOTIFY_SOCKET", "/run/notify", 1);
    setenv("WATCHDOG_USEC", "200000", 1);
    run.start();
    std::string told;
    const auto hears = [&](const std::string& word) {
        return eventually([&] {
            pollfd ready{manager, POLLIN, 0};
            std::array<char, 4096> text{};
            while (poll(&ready, 1, 0) == 1) {
                const ssize_t size = recv(manager, text.data(), text.size(), 0);
                told += std::string(text.data(), static_cast<std::size_t>(std::max<ssize_t>(size, 0))) + "\n";
            }
            return told.find(word) != std::string::npos;
        });
    };
    EXPECT_TRUE(hears("READY=1"));
    EXPECT_TRUE(hears("STATUS=")) << told;
    EXPECT_TRUE(hears("WATCHDOG=1\nWATCHDOG=1")) << told;
    told.clear();
    run.program().signal(SIGHUP);
    EXPECT_TRUE(hears("RELOADING=1\nMONOTONIC_USEC="));
    EXPECT_TRUE(hears("READY=1"));
    run.program().signal(SIGTERM);
    EXPECT_TRUE(hears("STOPPING=1"));
    run.program().wait();
    close(manager);
}

/// Numbers of events go on after any end, and those of earlier runs are told.
HOST_TEST(Service, RemembersWhatHappenedBefore) {
    for (std::uint64_t round = 1; round <= 3; ++round) {
        ServiceRun run(host);
        run.start();
        EXPECT_EQ(call::get(run.bus(), ServiceRun::kRoot, call::kAgent, "LastEvent"),
                  std::to_string(round - 1));
        call::ask(run.bus(), ServiceRun::kComputer, call::kNode, "Write",
                  call::write(115, "room " + std::to_string(round)));
        const call::ToldEvents all = call::eventsSince(run.bus(), 0);
        ASSERT_EQ(all.events.size(), round);
        EXPECT_EQ(all.dropped, 0U);
        for (std::uint64_t i = 0; i < round; ++i) {
            EXPECT_EQ(all.events[i].number, i + 1);
            EXPECT_EQ(all.events[i].after, "room " + std::to_string(i + 1));
        }
        EXPECT_EQ(call::eventsSince(run.bus(), round - 1).events.size(), 1U);
        EXPECT_EQ(call::eventsSince(run.bus(), round).events.size(), 0U);
        EXPECT_EQ(call::eventsSince(run.bus(), 1U << 20U).events.size(), 0U);
        EXPECT_EQ(call::get(run.bus(), ServiceRun::kRoot, call::kAgent, "LastEvent"), std::to_string(round));
        run.program().signal(round == 1 ? SIGKILL : SIGTERM);
        run.program().wait();
        host.remove("/run/corvista");
    }
}

/// One user's flood is refused beyond a measure, and costs another one nothing but his turn.
HOST_TEST(ServiceFlood, OfOneUserHoldsNobodyUp) {
    ServiceRun run(host);
    run.start();
    host.file("/var/hold", "");
    std::map<std::string, int> answers;
    std::vector<bus::Slot> pending;
    bus::Connection flooder(ServiceRun::address());
    // One connection waits for the answers, the others ask.
    constexpr int kCalls = 127;  // the bus itself lets one connection wait for no more
    std::vector<std::unique_ptr<bus::Connection>> more;
    for (int i = 0; i < 3; ++i) {
        more.push_back(std::make_unique<bus::Connection>(ServiceRun::address()));
        for (int j = 0; j < kCalls; ++j) {
            pending.push_back(more.back()->askLater(
                call::make(*more.back(), ServiceRun::kComputer, call::kNode, "Read",
                           [](bus::Writer& writer) { writer.put(std::vector<std::uint32_t>{904}); }),
                std::chrono::seconds(60), [&](const bus::Message& answer) {
                    ++answers[answer.isError() ? answer.error().name() : "done"];
                }));
        }
    }
    const auto processAll = [&] {
        int count = 0;
        for (const auto& connection : more) {
            connection->process();
        }
        for (const auto& [name, times] : answers) {
            count += times;
        }
        return count;
    };
    EXPECT_TRUE(call::until(flooder, [&] { return processAll() > 0; }));
    EXPECT_EQ(call::get(run.bus(), ServiceRun::kComputer, "com.vantrel.Corvista1.Computer", "HostName"),
              "fake");
    host.remove("/var/hold");
    EXPECT_TRUE(call::until(flooder, [&] { return processAll() == 3 * kCalls; }));
    EXPECT_GT(answers[bus::kLimitsExceeded], 100);
    EXPECT_GE(answers["done"], 128);
}

/// A client that has asked and never reads costs nobody anything.
HOST_TEST(ServiceFlood, OfAReaderThatNeverReadsIsLeftWithTheBus) {
    ServiceRun run(host);
    run.telling("drives").start();
    bus::Connection silent(ServiceRun::address());
    const bus::Slot slot = silent.match("type='signal'", [](const bus::Message&) {});
    silent.flush();
    std::vector<bus::Slot> waiting;  // what is sent without one wants no answer
    for (int i = 0; i < 3000; ++i) {
        waiting.push_back(silent.askLater(call::make(silent, ServiceRun::kRoot, call::kAgent, "Tree"),
                                          std::chrono::hours(1), [](const bus::Message&) {}));
    }
    silent.flush();
    const auto begun = std::chrono::steady_clock::now();
    EXPECT_EQ(call::get(run.bus(), ServiceRun::kRoot, call::kAgent, "Version"), "1.0.0");
    EXPECT_LT(std::chrono::steady_clock::now() - begun, std::chrono::seconds(20));
    const std::string status =
        host.read("/proc/" + std::to_string(run.program().pid()) + "/status").value_or("");
    EXPECT_LT(std::stol(status.substr(status.find("VmRSS:") + 6)), 100000) << status;
}

}  // namespace
