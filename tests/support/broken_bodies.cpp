// Tests that go wrong on purpose, each in its own way.
#include <unistd.h>

#include <csignal>
#include <cstdlib>
#include <stdexcept>
#include <thread>

#include "tests/support/fake_host.h"
#include "tests/support/shell.h"

namespace {

HOST_TEST(Broken, Expects) {
    EXPECT_EQ(1, 2) << "in the child";
    EXPECT_EQ(3, 4) << "and goes on";
}

HOST_TEST(Broken, Asserts) {
    ASSERT_TRUE(false) << "fatal there";
    ADD_FAILURE() << "not reached";
}

HOST_TEST(Broken, Throws) {
    throw std::runtime_error("thrown inside");
}

HOST_TEST(Broken, ThrowsANumber) {
    throw 7;
}

HOST_TEST(Broken, CannotWrite) {
    host.file("/proc/self/nothing", "");
}

HOST_TEST(Broken, IsKilled) {
    std::raise(SIGKILL);
}

HOST_TEST(Broken, Aborts) {
    std::abort();
}

HOST_TEST(Broken, ExitsWithAStatus) {
    _exit(3);
}

HOST_TEST(Broken, ExitsEarlyAsIfAllWereWell) {
    std::exit(0);
}

TEST(Broken, NeverEnds) {
    inFakeHost([](FakeHost&) { pause(); }, std::chrono::seconds(1));
}

HOST_TEST(Broken, CallsAnUnrecordedTool) {
    host.tool("ethtool eth0", "");
    shell("ethtool eth0 up 2> /dev/null");
}

HOST_TEST(Broken, Skips) {
    GTEST_SKIP() << "not on this host";
}

HOST_TEST(Broken, Leaks) {
    [[maybe_unused]] void* volatile lost = std::malloc(7);
    lost = nullptr;
}

HOST_TEST(Broken, ReadsFreedMemory) {
    char* volatile text = new char[7];
    delete[] text;
    EXPECT_EQ(text[3], text[3]);
}

HOST_TEST(Broken, Races) {
    int shared = 0;
    auto count = [&] {
        for (int i = 0; i < 1000; ++i) ++shared;
    };
    std::thread first(count), second(count);
    first.join();
    second.join();
    EXPECT_GT(shared, 0);
}

}  // namespace
