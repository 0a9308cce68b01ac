// The processors and the memory of the host that the tests run on, beside what its tools and /proc tell.
#include <gtest/gtest.h>
#include <sys/sysinfo.h>
#include <sys/utsname.h>
#include <unistd.h>

#include <array>
#include <cstdio>
#include <ctime>
#include <nlohmann/json.hpp>

#include "tests/hardware/recorded_host.h"

namespace {

using hardware::Class;
using Json = nlohmann::json;

std::string printed(const char* command) {
    std::string text;
    FILE* const pipe = popen(command, "r");
    std::array<char, 4096> piece{};
    for (std::size_t count = 0; (count = fread(piece.data(), 1, piece.size(), pipe)) > 0;) {
        text.append(piece.data(), count);
    }
    pclose(pipe);
    return text;
}

/// What lscpu tells, by its field; "" for what it does not.
std::string lscpu(const Json& fields, const std::string& field) {
    for (const Json& one : fields) {
        if (one.value("field", "") == field && one.contains("data") && one["data"].is_string()) {
            return one["data"];
        }
        if (one.contains("children")) {
            if (std::string below = lscpu(one["children"], field); !below.empty()) {
                return below;
            }
        }
    }
    return "";
}

/// The sum of a property over all processors.
unsigned long long sum(const std::string& property) {
    const hardware::Host host;
    unsigned long long all = 0;
    for (const std::string& name : listed(host, Class::processor)) {
        all += hardware::asNumber(told(host, Class::processor, name, property)).value_or(0);
    }
    return all;
}

TEST(ThisHost, ProcessorsAreThoseOfTheKernel) {
    EXPECT_EQ(sum("Threads"), static_cast<unsigned long long>(sysconf(_SC_NPROCESSORS_ONLN)));
    EXPECT_GE(sum("Threads"), sum("Cores"));
}

TEST(ThisHost, ProcessorsAreThoseOfLscpu) {
    const Json all = Json::parse(printed("LC_ALL=C lscpu -J -B 2>/dev/null"), nullptr, false);
    if (all.is_discarded() || !all.contains("lscpu")) {
        GTEST_SKIP() << "no lscpu";
    }
    const Json& fields = all["lscpu"];
    const hardware::Host host;
    const auto compare = [&](const std::string& field, const std::string& own) {
        if (const std::string theirs = lscpu(fields, field); !theirs.empty()) {
            EXPECT_EQ(own, theirs) << field;
        }
    };
    compare("CPU(s):", std::to_string(sum("Threads")));
    compare("Socket(s):", told(host, Class::system, "", "ProcessorSockets"));
    compare("Vendor ID:", told(host, Class::processor, listed(host, Class::processor).front(), "Maker"));
    compare("Model name:", told(host, Class::processor, listed(host, Class::processor).front(), "Model"));
    for (const auto& [field, property] : {std::pair{"L1d:", "Level1DataCache"},
                                          {"L1i:", "Level1InstructionCache"},
                                          {"L2:", "Level2Cache"},
                                          {"L3:", "Level3Cache"}}) {
        const std::string theirs = lscpu(fields, field);
        if (!theirs.empty()) {
            EXPECT_EQ(std::to_string(sum(property)), theirs.substr(0, theirs.find(' '))) << field;
        }
    }
}

TEST(ThisHost, MemoryIsThatOfTheKernel) {
    const hardware::Host host;
    struct sysinfo info {};
    ASSERT_EQ(sysinfo(&info), 0);
    EXPECT_EQ(told(host, Class::memory, "", "TotalMemory"),
              std::to_string(1ULL * info.totalram * info.mem_unit));
    EXPECT_EQ(told(host, Class::memory, "", "TotalSwap"),
              std::to_string(1ULL * info.totalswap * info.mem_unit));
}

TEST(ThisHost, SystemIsThatOfTheKernel) {
    const hardware::Host host;
    utsname names{};
    ASSERT_EQ(uname(&names), 0);
    EXPECT_EQ(told(host, Class::system, "", "Kernel"), names.release);
    struct sysinfo info {};
    ASSERT_EQ(sysinfo(&info), 0);
    const auto boot = static_cast<double>(std::time(nullptr) - info.uptime);
    EXPECT_NEAR(std::stod(told(host, Class::system, "", "BootTime")), boot, 60);
}

}  // namespace
