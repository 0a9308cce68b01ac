// Answers that the bus does not take, and that nobody reads.
#include <gmock/gmock.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include "agent/service/turns.h"
#include "tests/service/service_run.h"
#include "tests/support/waiting.h"

namespace {

[[maybe_unused]] long highestMemory(FakeHost& host, int process) {
    const std::string status = host.read("/proc/" + std::to_string(process) + "/status").value_or("");
    return std::stol(status.substr(status.find("VmHWM:") + 6));
}

/// A bus that takes nothing: who has connected to it waits for its greeting.
class MuteBus {
public:
    static constexpr const char* kAddress = "unix:path=/run/mute";

    MuteBus() : socket_(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
        const sockaddr_un name{AF_UNIX, "/run/mute"};
        EXPECT_EQ(bind(socket_, reinterpret_cast<const sockaddr*>(&name), sizeof name), 0);
        EXPECT_EQ(listen(socket_, 1), 0);
    }
    MuteBus(const MuteBus&) = delete;
    MuteBus& operator=(const MuteBus&) = delete;
    ~MuteBus() { close(socket_); }

private:
    int socket_;
};

HOST_TEST(ServiceTurns, WaitUntilTheBusHasTakenWhatItWasGiven) {
    host.directory("/run");
    const MuteBus mute;
    bus::Connection connection(MuteBus::kAddress);
    ASSERT_GT(connection.unsent(), 0U);
    cvagent::service::Loop loop;
    const cvagent::service::Unread unread(connection, loop);
    cvagent::service::Turns turns(connection, loop, unread);
    bool answered = false;
    EXPECT_TRUE(turns.submit(7, [&answered] { answered = true; }));
    const auto end = loop.after(std::chrono::milliseconds(20), [&loop] { loop.stop(); });
    loop.run();
    EXPECT_FALSE(answered);
}

/// Made at once, the answers to all that were asked for the whole tree would fill the memory.
HOST_TEST(ServiceAttack, LargeAnswersWaitForTheBus) {
    ServiceRun run(host);
    run.telling("drives").start();
    [[maybe_unused]] const long before = highestMemory(host, run.program().pid());
    constexpr int kClients = 24;
    constexpr int kCalls = 120;
    std::map<std::string, int> answers;
    std::vector<std::unique_ptr<bus::Connection>> clients;
    std::vector<bus::Slot> pending;
    for (int i = 0; i < kClients; ++i) {
        clients.push_back(std::make_unique<bus::Connection>(ServiceRun::address()));
        clients.back()->uniqueName();
    }
    for (const auto& client : clients) {
        for (int i = 0; i < kCalls; ++i) {
            pending.push_back(
                client->askLater(call::make(*client, ServiceRun::kRoot, call::kAgent, "Tree"),
                                 std::chrono::seconds(60), [&](const bus::Message& answer) {
                                     ++answers[answer.isError() ? answer.error().name() : "done"];
                                 }));
        }
    }
    EXPECT_EQ(call::get(run.bus(), ServiceRun::kRoot, call::kAgent, "Version"), "1.0.0");
    EXPECT_TRUE(call::until(run.bus(), [&] {
        for (const auto& client : clients) {
            client->process();
        }
        return answers["done"] + answers[bus::kLimitsExceeded] == kClients * kCalls;
    }));
    EXPECT_GE(answers["done"], 256);
#if !defined(__SANITIZE_THREAD__) && !defined(__SANITIZE_ADDRESS__)  // which keep accounts of their own
    EXPECT_LT(highestMemory(host, run.program().pid()) - before, 6000);
#endif
}

/// The agent on a bus with the limits that a system's has when nobody says otherwise.
class UnlimitedBus {
public:
    static constexpr const char* kAddress = "unix:path=/run/limits/bus";

    explicit UnlimitedBus(FakeHost& host) {
        host.realTool("dbus-daemon");
        host.directory("/run/limits");
        host.file("/etc/passwd", "root:x:0:0::/root:/bin/sh\n");
        host.file("/etc/bus.conf", std::string("<busconfig><listen>") + kAddress +
                                       "</listen><auth>EXTERNAL</auth><policy context='default'>"
                                       "<allow user='*'/><allow own='*'/><allow send_destination='*' "
                                       "eavesdrop='true'/><allow eavesdrop='true'/>"
                                       "</policy></busconfig>");
        bus_ = started(host, {"dbus-daemon", "--config-file=/etc/bus.conf", "--nofork"});
        eventually([&host] { return host.exists("/run/limits/bus"); });
        agent_ = started(host, {"env", "CORVISTA_FAKE_PLUGIN=drives", CVAGENTD_PROGRAM, "--bus", kAddress,
                                "--host-tools", "native", "--plugin", FAKE_PLUGIN_FILE});
        eventually([this] { return agent_->err().find(" nodes on the bus as ") != std::string::npos; });
    }
    std::string said() const { return agent_->err(); }

private:
    using Program = std::unique_ptr<RunningProgram>;
    static Program started(FakeHost& host, const std::vector<std::string>& words) {
        return Program(new RunningProgram(host.start(words)));
    }

    Program bus_;
    Program agent_;
};

/// What waits for them counts against the agent, to whom the bus would listen no more.
HOST_TEST(ServiceAttack, AFewWhoNeverReadDoNotSilenceTheAgent) {
    const UnlimitedBus own(host);
    bus::Connection other(UnlimitedBus::kAddress);
    const auto version = [&other] { return call::get(other, ServiceRun::kRoot, call::kAgent, "Version"); };
    ASSERT_EQ(version(), "1.0.0");
    std::map<std::string, int> answers;
    std::vector<std::unique_ptr<bus::Connection>> silent;
    std::vector<bus::Slot> waiting;
    for (int reader = 0; reader < 4; ++reader) {
        silent.push_back(std::make_unique<bus::Connection>(UnlimitedBus::kAddress));
        silent.back()->uniqueName();
    }
    const auto tree = [&other] { call::ask(other, ServiceRun::kRoot, call::kAgent, "Tree"); };
    for (int round = 0; round < 400 && own.said().find("does not read") == std::string::npos; ++round) {
        for (const auto& one : silent) {
            for (int i = 0; i < 8; ++i) {
                waiting.push_back(
                    one->askLater(call::make(*one, ServiceRun::kRoot, call::kAgent, "Tree"),
                                  std::chrono::hours(1), [&answers](const bus::Message& answer) {
                                      ++answers[answer.isError() ? answer.error().name() : "done"];
                                  }));
            }
            one->flush();
        }
        ASSERT_NO_THROW(tree());  // it comes behind those
    }
    ASSERT_EQ(version(), "1.0.0");
    EXPECT_THAT(own.said(), testing::HasSubstr(" does not read what it is sent"));
    const auto isAnswered = [](bus::Connection& one) {
        return call::until(one, [&one, answered = false]() mutable {
            answered = answered || call::errorOf(one, ServiceRun::kRoot, call::kAgent, "Tree").empty();
            return answered;
        });
    };
    EXPECT_TRUE(isAnswered(other));
    // Who reads is answered again.
    for (const auto& one : silent) {
        EXPECT_TRUE(isAnswered(*one));
        one->process();
    }
    EXPECT_GT(answers["done"], 100);
}

/// Runs the loop until something comes true.
bool until(cvagent::service::Loop& loop, const std::function<bool()>& condition) {
    const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(60);
    while (!condition() && std::chrono::steady_clock::now() < end) {
        const auto next = loop.after(std::chrono::milliseconds(1), [] {});
        sd_event_run(loop.get(), 1000000);
    }
    return condition();
}

/// Who asks by many connections and reads none of them does not silence the agent either.
HOST_TEST(ServiceAttack, ManyConnectionsOfAUserAreOneReader) {
    using cvagent::service::Unread;
    const UnlimitedBus own(host);
    bus::Connection sender(UnlimitedBus::kAddress);
    cvagent::service::Loop loop;
    sd_bus_attach_event(sender.get(), loop.get(), SD_EVENT_PRIORITY_NORMAL);
    constexpr std::size_t kMebi = std::size_t{1} << 20U;
    Unread unread(sender, loop, {{{kMebi, 2 * kMebi, kMebi}}, 4 * kMebi});
    int full = 0;
    unread.whenFull([&full] { ++full; });
    const auto answered = [&](const std::string& name, std::uint32_t user) {
        return unread.largeAnswerFor({name, user, {}});
    };
    std::vector<std::unique_ptr<bus::Connection>> readers;
    const auto leaveUnread = [&](std::uint32_t user) {
        readers.push_back(std::make_unique<bus::Connection>(UnlimitedBus::kAddress));
        const std::string name = readers.back()->uniqueName();
        EXPECT_TRUE(until(loop, [&] { return unread.isKnown(); }));
        EXPECT_EQ(answered(name, user), Unread::Answer::whole);
        const bus::Message large = sender.newSignal("/x", "x.y", "Z");
        bus::Writer(large).put(std::string(kMebi - kMebi / 8, 'x'));
        sd_bus_message_set_destination(large.get(), name.c_str());
        sender.send(large);
    };
    leaveUnread(7);
    leaveUnread(7);
    leaveUnread(8);
    const auto isRefused = [&](std::uint32_t user) {
        return [&, user] { return unread.isKnown() && answered(":1.9999", user) == Unread::Answer::refusal; };
    };
    EXPECT_TRUE(until(loop, isRefused(7)));
    EXPECT_EQ(answered(":1.9999", 8), Unread::Answer::whole);
    EXPECT_EQ(full, 0);
    leaveUnread(9);
    leaveUnread(10);
    EXPECT_TRUE(until(loop, [&] {
        unread.signalled();
        return full == 1;
    }));
    readers.clear();
    EXPECT_TRUE(
        until(loop, [&] { return unread.isKnown() && answered(":1.9999", 7) == Unread::Answer::whole; }));
}

}  // namespace
