// The kernel's news: which are told, and when.
#include "plugins/hardware/watcher.h"

#include <gmock/gmock.h>
#include <linux/netlink.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <memory>
#include <mutex>
#include <stdexcept>
#include <utility>
#include <vector>

#include "tests/support/waiting.h"

namespace {

using hardware::Watcher;
using std::chrono::milliseconds;
using namespace std::string_literals;

std::string deviceNews(const std::string& subsystem) {
    return "add@/devices/virtual/x/y\0ACTION=add\0DEVPATH=/devices/virtual/x/y\0SUBSYSTEM="s + subsystem +
           "\0SEQNUM=1234\0"s;
}

/// A watcher whose news come from this end of a pair of sockets.
class Watched : public testing::Test {
protected:
    Watched() {
        EXPECT_EQ(socketpair(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0, devices_), 0);
        EXPECT_EQ(socketpair(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0, links_), 0);
    }
    ~Watched() override {
        watcher_.reset();
        close(devices_[1]);
        close(links_[1]);
    }
    void watch(Watcher::Times times) {
        watcher_ = std::make_unique<Watcher>([this](const std::string& subsystem) { hear(subsystem); },
                                             Watcher::News{devices_[0], links_[0]}, times);
    }
    virtual void hear(const std::string& subsystem) {
        const std::lock_guard lock(guard_);
        heard_.push_back(subsystem);
    }
    void tell(const std::string& news) const { send(devices_[1], news.data(), news.size(), 0); }
    void tellOfLink() const { send(links_[1], "link", 4, 0); }
    std::vector<std::string> heard() {
        const std::lock_guard lock(guard_);
        return heard_;
    }
    bool hears(std::size_t count) {
        return eventually([&] { return heard().size() >= count; });
    }

    int devices_[2]{};
    int links_[2]{};
    std::mutex guard_;
    std::vector<std::string> heard_;
    std::unique_ptr<Watcher> watcher_;
};

using Heard = std::vector<std::string>;
constexpr milliseconds kTogether{50};
constexpr Watcher::Times kQuick{kTogether, milliseconds(10000), milliseconds(60000)};

TEST(DeviceNews, NameTheirSubsystem) {
    EXPECT_EQ(Watcher::subsystemOf(deviceNews("net")), "net");
    EXPECT_EQ(Watcher::subsystemOf("add@/x\0SUBSYSTEM=block"s), "block") << "without a NUL at the end";
}

TEST(DeviceNews, ThatNameNoneAreNone) {
    EXPECT_EQ(Watcher::subsystemOf(""), "");
    EXPECT_EQ(Watcher::subsystemOf("add@/SUBSYSTEM=net"), "") << "not at the start of a field";
    EXPECT_EQ(Watcher::subsystemOf("add@/x\0XSUBSYSTEM=net\0"s), "");
    EXPECT_EQ(Watcher::subsystemOf("add@/x\0SUBSYSTEM=\0SEQNUM=1"s), "");
    EXPECT_EQ(Watcher::subsystemOf("libudev\0\xfe\xed\xca\xfe"s), "") << "udev's own form";
}

// What is there before the watch begins has come together, however long the machine keeps a thread waiting.
TEST_F(Watched, NewsThatComeTogetherAreToldOnce) {
    constexpr int kHeldBySockets = 8;
    for (int count = 0; count < kHeldBySockets; ++count) {
        tell(deviceNews("net"));
        tellOfLink();
    }
    watch(kQuick);
    ASSERT_TRUE(hears(1));
    tell(deviceNews("block"));
    ASSERT_TRUE(hears(2));
    EXPECT_EQ(heard(), (Heard{"net", "block"}));
}

TEST_F(Watched, EachSubsystemIsTold) {
    tell(deviceNews("hwmon"));
    tell(deviceNews("block"));
    watch(kQuick);
    ASSERT_TRUE(hears(2));
    EXPECT_EQ(heard(), (Heard{"block", "hwmon"}));
}

TEST_F(Watched, AFloodIsToldWhileItLasts) {
    watch({milliseconds(50), milliseconds(100), milliseconds(60000)});
    const auto start = std::chrono::steady_clock::now();
    while (heard().size() < 2 && std::chrono::steady_clock::now() - start < std::chrono::seconds(10)) {
        tell(deviceNews("net"));
        std::this_thread::sleep_for(milliseconds(1));
    }
    Heard first = heard();
    ASSERT_GE(first.size(), 2U);
    first.resize(2);
    EXPECT_EQ(first, (Heard{"net", "net"}));
}

TEST_F(Watched, WithoutNewsEverythingIsToldNowAndThen) {
    watch({milliseconds(10), milliseconds(20), milliseconds(30)});
    ASSERT_TRUE(hears(2));
    EXPECT_EQ(heard().front(), "");
}

TEST_F(Watched, NewsDoNotPutOffEverything) {
    watch({milliseconds(1), milliseconds(2), milliseconds(60)});
    const auto toldBoth = [this] {
        tell(deviceNews("net"));
        return testing::Value(heard(), testing::IsSupersetOf({"", "net"}));
    };
    EXPECT_TRUE(eventually(toldBoth));
}

TEST_F(Watched, WhatIsNoNewsIsNotTold) {
    tell("add@/x\0SEQNUM=1"s);
    tell(std::string(5000, 'x'));
    tell(std::string("\0", 1));
    tell(deviceNews("block"));
    watch(kQuick);
    ASSERT_TRUE(hears(1));
    tellOfLink();
    ASSERT_TRUE(hears(2)) << "and it still listens";
    EXPECT_EQ(heard(), (Heard{"block", "net"}));
}

TEST_F(Watched, WhatOthersThanTheKernelSendIsNoNews) {
    const Watcher::News kernel = Watcher::kernelNews();
    sockaddr_nl own{};
    socklen_t size = sizeof own;
    const int stranger = socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC, NETLINK_KOBJECT_UEVENT);
    ASSERT_EQ(getsockname(kernel.devices, reinterpret_cast<sockaddr*>(&own), &size), 0);
    own.nl_groups = 0;
    const std::string forged = deviceNews("forged");
    const bool sent =
        sendto(stranger, forged.data(), forged.size(), 0, reinterpret_cast<sockaddr*>(&own), size) > 0;
    close(stranger);
    close(kernel.links);
    close(std::exchange(devices_[0], kernel.devices));
    watch(kQuick);
    tellOfLink();
    EXPECT_TRUE(hears(1));
    EXPECT_THAT(heard(), testing::Not(testing::Contains("forged")));
    if (!sent) {
        GTEST_SKIP() << "only root can send any";
    }
}

class WatchedByOneThatThrows : public Watched {
    void hear(const std::string& subsystem) override {
        Watched::hear(subsystem);
        throw std::runtime_error("no memory");
    }
};

TEST_F(WatchedByOneThatThrows, ItIsToldAgain) {
    watch(kQuick);
    tellOfLink();
    ASSERT_TRUE(hears(1));
    tellOfLink();
    EXPECT_TRUE(hears(2));
}

TEST(Watching, EndsAtOnceWithoutAnyNews) {
    const auto start = std::chrono::steady_clock::now();
    {
        const Watcher watcher([](const std::string&) {}, {-1, -1}, Watcher::Times());
    }
    {
        const Watcher watcher([](const std::string&) {});
    }
    EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(5));
}

}  // namespace
