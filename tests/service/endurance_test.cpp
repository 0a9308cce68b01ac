// The service over a long time: a day of simulated life, and ends by force at any moment. In the everyday run
// a part of each; scripts/endurance has them whole.
#include <gmock/gmock.h>
#include <signal.h>
#include <unistd.h>

#include <algorithm>
#include <cctype>
#include <cstdlib>
#include <filesystem>
#include <limits>
#include <random>

#include "agent/history/database.h"
#include "agent/history/history.h"
#include "tests/service/fresh_tree.h"
#include "tests/support/amounts.h"
#include "tests/support/waiting.h"

namespace {

using Clock = std::chrono::steady_clock;
using std::chrono::milliseconds;

const auto kKills = numberFrom("CORVISTA_KILLS", 10);
const auto kMinutes = numberFrom("CORVISTA_MINUTES", 120);
const auto kSeed = seedOfRun();

constexpr const char* kHistoryFolder = "/var/lib/corvista";
constexpr std::uint32_t kContact = 115;

/// Waits for what takes its time on a busy machine.
template <class Condition>
bool inTime(const Condition& condition) {
    const auto end = Clock::now() + std::chrono::seconds(60);
    while (!condition()) {
        if (Clock::now() > end) {
            return false;
        }
        usleep(2000);
    }
    return true;
}

std::size_t entriesOf(const std::string& directory) {
    std::error_code gone;
    const std::filesystem::directory_iterator entries(directory, gone);
    return gone ? 0 : static_cast<std::size_t>(std::distance(begin(entries), end(entries)));
}

std::size_t processes() {
    std::size_t count = 0;
    for (const auto& entry : std::filesystem::directory_iterator("/.proc")) {  // /proc has places for more
        count += std::isdigit(static_cast<unsigned char>(entry.path().filename().string().front())) != 0;
    }
    return count;
}

/// What the history has, and whether its file is sound.
class Kept {
public:
    Kept() {
        const cvagent::HistoryPlace place = cvagent::ownHistoryPlace();
        for (const cvagent::HistoryEntry& entry : cvagent::HistoryReader(place).read({}, 10'000'000)) {
            ++count;
            EXPECT_GT(entry.event.number, last_);
            last_ = entry.event.number;
            if (entry.event.kind == cvagent::Event::Kind::written) {
                ++writes[entry.event.wanted];
            } else if (entry.event.kind == cvagent::Event::Kind::alert) {
                ++alerts[entry.event.message];
            }
        }
        const cvagent::Database database(place.file(), cvagent::Database::Access::read);
        cvagent::Statement check(database.handle(), "PRAGMA integrity_check");
        EXPECT_TRUE(check.next());
        EXPECT_EQ(check.text(0), "ok");
        check.reset();
    }

    std::size_t count = 0;
    std::map<std::string, int> writes;
    std::map<std::string, int> alerts;

private:
    std::uint64_t last_ = 0;
};

/// Clients that write without a pause.
class Writers {
public:
    Writers(std::string name, std::vector<std::string>& acknowledged)
        : name_(std::move(name)), acknowledged_(acknowledged) {
        for (Client& client : clients_) {
            client.bus.emplace(ServiceRun::address());
            write(client);
        }
    }
    /// Takes what has come. @return false when the bus is gone
    bool process() {
        bool any = false;
        for (Client& client : clients_) {
            try {
                client.bus->process();
                any = true;
            } catch (const bus::Error&) {
                continue;
            }
            if (client.answered) {
                write(client);
            }
        }
        return any;
    }

private:
    struct Client {
        std::optional<bus::Connection> bus;
        bus::Slot call;
        bool answered = false;
    };

    void write(Client& client) {
        const std::string value = name_ + "-" + std::to_string(++count_);
        client.answered = false;
        try {
            client.call = client.bus->askLater(call::make(*client.bus, ServiceRun::kComputer, call::kNode,
                                                          "Write", call::write(kContact, value)),
                                               std::chrono::seconds(60),
                                               [this, &client, value](const bus::Message& answer) {
                                                   if (!answer.isError()) {
                                                       acknowledged_.push_back(value);
                                                   }
                                                   client.answered = true;
                                               });
        } catch (const bus::Error&) {
            // The bus is gone, which the next processing finds, too.
        }
    }

    const std::string name_;
    std::vector<std::string>& acknowledged_;
    unsigned long count_ = 0;
    std::array<Client, 3> clients_;
};

class Kills : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        run.emplace(host);
        run->telling("alerts");
        host.file("/var/diary.alerts", "100000000");
    }
    static bool isReady(const RunningProgram& service) {
        return service.err().find(" nodes on the bus as ") != std::string::npos;
    }
    /// One life of the service, and its end by force: a while after it was ready, or at any moment from its
    /// start on.
    void liveAndDie(FakeHost& host, unsigned long round) {
        RunningProgram service = host.start(run->commandLine());
        const bool isBusy = round % 2 == 0;
        ASSERT_TRUE(!isBusy || inTime([&] { return isReady(service); })) << service.err();
        const std::size_t before = acknowledged.size();
        const auto end = Clock::now() + milliseconds(random() % 150);
        std::optional<Writers> writers;
        while (Clock::now() < end || (isBusy && acknowledged.size() == before)) {
            ASSERT_LT(Clock::now(), end + std::chrono::seconds(60));
            if (!writers && isReady(service)) {
                writers.emplace(std::to_string(round), acknowledged);
                ++busyLives;
            }
            if (writers) {
                writers->process();
            }
            usleep(200);
        }
        service.signal(SIGKILL);
        service.wait();
        if (writers) {
            EXPECT_TRUE(inTime([&] { return !writers->process(); })) << "the bus lives on";
        }
    }

    std::optional<ServiceRun> run;
    std::mt19937 random{kSeed};
    std::vector<std::string> acknowledged;
    unsigned long busyLives = 0;
};

HOST_TEST_F(Kills, LoseNothingThatWasAcknowledged) {
    SCOPED_TRACE("CORVISTA_SEED=" + std::to_string(kSeed));
    const std::size_t before = processes();
    for (unsigned long round = 0; round < kKills && !HasFailure(); ++round) {
        liveAndDie(host, round);
        EXPECT_TRUE(inTime([&] { return processes() == before; })) << processes() << " after round " << round;
    }
    run->start();
    const auto alertsTold = [&] { return std::stoul(host.read("/var/diary.told").value_or("0")); };
    EXPECT_TRUE(inTime([&] { return alertsTold() >= kKills; }));
    run->program().signal(SIGTERM);
    run->program().wait();
    const unsigned long told = alertsTold();
    const Kept kept;
    for (const std::string& value : acknowledged) {
        const auto entry = kept.writes.find(value);
        EXPECT_TRUE(entry != kept.writes.end()) << "lost: " << value;
    }
    for (const auto& [value, times] : kept.writes) {
        EXPECT_EQ(times, 1) << value;
    }
    for (unsigned long number = 1; number <= told; ++number) {
        const auto entry = kept.alerts.find("alert " + std::to_string(number));
        EXPECT_TRUE(entry != kept.alerts.end() && entry->second == 1) << "alert " << number << " of " << told;
    }
    EXPECT_LE(kept.alerts.size(), told + 1);
    for (const std::string& file : host.listDirectory(kHistoryFolder)) {
        EXPECT_EQ(file.find("damaged"), std::string::npos) << file;
    }
    EXPECT_GE(acknowledged.size(), kKills / 2);
    std::printf(
        "%lu kills, %lu of them while clients wrote: %zu writes acknowledged, %lu alerts taken, %zu "
        "entries\n",
        kKills, busyLives, acknowledged.size(), told, kept.count);
}

/// What must not grow.
struct Size {
    long kilobytes;
    std::size_t descriptors;
    std::size_t threads;
    long historyKilobytes;
};

class ADay : public Freshness {
protected:
    void setUpHost(FakeHost& host) override {
        Freshness::setUpHost(host);
        ip(host, cable("eth0", "sw0"));
        ip(host, cable("eth1", "sw1"));
        run.emplace(host);
        run->plugin(CORVISTA_PLUGIN_FILE).andPlugin(FAKE_PLUGIN_FILE).telling("alerts").hostTools("auto");
        run->config("history-size = 1\nlook-every = 10\n").start();
        watcher.emplace(ServiceRun::address());
        events = watcher->match("type='signal',interface='com.vantrel.Corvista1.Agent',member='Event'",
                                [this](const bus::Message&) { ++heard; });
    }
    Size size(FakeHost& host) {
        const std::string process = "/proc/" + std::to_string(run->program().pid());
        // Not from "status": the kernel's sum there is behind by up to 64 pages a thread.
        const std::string memory = host.read(process + "/smaps_rollup").value_or("");
        long bytes = 0;
        for (const std::string& file : host.listDirectory(kHistoryFolder)) {
            std::error_code gone;
            const auto size = std::filesystem::file_size(std::string(kHistoryFolder) + "/" + file, gone);
            bytes += gone ? 0 : static_cast<long>(size);
        }
        return {std::stol(memory.substr(memory.find("\nRss:") + 5)), entriesOf(process + "/fd"),
                entriesOf(process + "/task"), bytes >> 10};
    }
    static void changeLinks(FakeHost& host, unsigned long minute) {
        static const Lines kFlaps = {"link set sw0 down", "link set sw0 up",
                                     "address add 10.1.0.1/24 dev eth0", "route add default via 10.1.0.254",
                                     "address del 10.1.0.1/24 dev eth0"};
        std::string batch = kFlaps[minute % kFlaps.size()] + "\n";
        if (minute % 20 == 7) {
            batch += "link add enp9s0 type veth peer name sw9\nlink set enp9s0 up\n";
        } else if (minute % 20 == 17) {
            batch += "link del enp9s0\n";
        }
        host.file("/changes", batch);
        EXPECT_EQ(host.run({"ip", "-batch", "/changes"}).status, 0) << batch;
    }
    /// One that comes, looks around and goes.
    static void visit(unsigned long minute) {
        const bus::Connection visitor(ServiceRun::address());
        call::ask(visitor, ServiceRun::kRoot, call::kAgent, "Tree");
        call::getAll(visitor, ServiceRun::kComputer, "com.vantrel.Corvista1.Computer");
        if (minute % 5 == 0) {
            call::ask(visitor, ServiceRun::kRoot, "org.freedesktop.DBus.ObjectManager", "GetManagedObjects");
            call::eventsSince(visitor, minute);
        }
    }
    /// One that wants to hear everything, asks for everything and never reads.
    void hang() {
        auto& stuck = hanging.emplace_back(std::make_unique<bus::Connection>(ServiceRun::address()));
        stuckMatches.push_back(stuck->match("type='signal'", [](const bus::Message&) {}));
        for (int calls = 0; calls < 20; ++calls) {
            stuck->send(call::make(*stuck, ServiceRun::kRoot, call::kAgent, "Tree"));
        }
        stuck->flush();
        if (hanging.size() > 3) {
            stuckMatches.erase(stuckMatches.begin());
            hanging.erase(hanging.begin());
        }
    }
    void liveAMinute(FakeHost& host, unsigned long minute) {
        changeLinks(host, minute);
        host.file("/var/diary.alerts", std::to_string(minute / 3));
        visit(minute);
        call::read(run->bus(), ServiceRun::kPort, {57, 123});
        call::ask(run->bus(), ServiceRun::kComputer, call::kNode, "Write",
                  call::write(kContact, "minute " + std::to_string(minute)));
        if (minute % 15 == 3) {
            hang();
        }
        if (minute % 60 == 30) {
            run->program().signal(SIGHUP);
        }
        watcher->process();
    }

    std::optional<ServiceRun> run;
    std::optional<bus::Connection> watcher;
    bus::Slot events;
    unsigned long heard = 0;
    std::vector<std::unique_ptr<bus::Connection>> hanging;
    std::vector<bus::Slot> stuckMatches;
};

std::string textOf(const Size& size) {
    return std::to_string(size.kilobytes) + " kB, " + std::to_string(size.descriptors) + " descriptors, " +
           std::to_string(size.threads) + " threads, history " + std::to_string(size.historyKilobytes) +
           " kB";
}

/// Value by value. What is at work for a moment needs more, so what counts is the least of some time.
Size leastOf(const Size& one, const Size& other) {
    return {std::min(one.kilobytes, other.kilobytes), std::min(one.descriptors, other.descriptors),
            std::min(one.threads, other.threads), std::min(one.historyKilobytes, other.historyKilobytes)};
}

bool isWithin(const Size& size, const Size& bound) {
    const Size least = leastOf(size, bound);
    return least.kilobytes == size.kilobytes && least.descriptors == size.descriptors &&
           least.threads == size.threads && least.historyKilobytes == size.historyKilobytes;
}

/// The first quarter, an hour at least, is let pass: threads are made as they are needed. The last 1024
/// events are kept in memory, a kilobyte each, until that many have come; the history may have a mebibyte and
/// what SQLite has not written back.
HOST_TEST_F(ADay, LeavesTheServiceAsItWas) {
    constexpr unsigned long kSettled = 30;
    const unsigned long warmUp = std::max(kMinutes / 4, 2 * kSettled);
    const unsigned long end = warmUp + kMinutes;
    const auto keptEvents = [this] { return static_cast<long>(std::min(heard, 1024UL)); };
    std::optional<Size> settled;
    long early = 0;
    for (unsigned long minute = 1; minute <= end && !HasFatalFailure(); ++minute) {
        liveAMinute(host, minute);
        if (minute > warmUp - kSettled && minute <= warmUp) {
            settled = leastOf(size(host), settled.value_or(size(host)));
            early = keptEvents();
        }
    }
    const std::string told = std::to_string(end / 3);
    EXPECT_TRUE(inTime([&] { return host.read("/var/diary.told").value_or("") == told + "\n"; }));
    EXPECT_TRUE(call::until(*watcher, [&] { return heard >= end + end / 3; })) << heard;
    Size bound = {settled->kilobytes + 1024 + keptEvents() - early, settled->descriptors,
                  settled->threads + 4, 6 << 10};
#if defined(__SANITIZE_THREAD__) || defined(__SANITIZE_ADDRESS__)  // which keep accounts of their own
    bound.kilobytes = std::numeric_limits<long>::max();
#endif
    Size now{};
    EXPECT_TRUE(inTime([&] { return isWithin(now = size(host), bound); })) << "the bound: " << textOf(bound);
    std::printf("%lu minutes, %lu events: %s; after the first %lu: %s\n", kMinutes, heard,
                textOf(now).c_str(), warmUp, textOf(*settled).c_str());
    run->program().signal(SIGTERM);
    EXPECT_EQ(run->program().wait().status, 128 + SIGTERM);
    const Kept kept;
    EXPECT_EQ(kept.writes.count("minute " + std::to_string(end)), 1U);
    EXPECT_EQ(kept.alerts.count("alert " + told), 1U);
}

}  // namespace
