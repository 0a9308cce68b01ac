// Processors of all kinds: with several sockets, with cores of several kinds, with some switched off.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <ctime>

#include "tests/hardware/recorded_host.h"

namespace {

using hardware::Class;
using testing::ElementsAre;
using testing::IsEmpty;

class Processors : public testing::Test {
protected:
    void cpu(int number, const std::string& file, const std::string& text) const {
        recorded_.file("/sys/devices/system/cpu/cpu" + std::to_string(number) + "/" + file, text);
    }
    void topology(int number, const std::string& package, const std::string& siblings) const {
        cpu(number, "topology/physical_package_id", package);
        cpu(number, "topology/core_cpus_list", siblings);
    }
    std::string fact(const std::string& processor, const std::string& property) const {
        return told(recorded_.host(), Class::processor, processor, property);
    }
    std::vector<std::string> names() const { return listed(recorded_.host(), Class::processor); }

    RecordedHost recorded_;
};

TEST_F(Processors, OfAHostThatTellsNoneThereAreNone) {
    EXPECT_THAT(names(), IsEmpty());
    EXPECT_EQ(told(recorded_.host(), Class::processor, "0"), "");
}

TEST_F(Processors, OtherDirectoriesAreNone) {
    for (const char* name : {"cpufreq", "cpuidle", "cpu", "cpux", "power", "xcpu1"}) {
        recorded_.file(std::string("/sys/devices/system/cpu/") + name + "/", "");
    }
    EXPECT_THAT(names(), IsEmpty());
}

TEST_F(Processors, WithoutATopologyThereIsOne) {
    cpu(0, "", "");
    topology(1, "-1", "1");
    EXPECT_THAT(names(), ElementsAre("0"));
    EXPECT_EQ(fact("0", "Threads"), "2");
    EXPECT_EQ(fact("0", "Cores"), "2");
}

TEST_F(Processors, ThoseThatAreOffAreNotCounted) {
    topology(0, "0", "0-1");
    topology(1, "0", "0-1");
    cpu(1, "online", "1");
    cpu(2, "online", "0");
    EXPECT_EQ(fact("0", "Threads"), "2");
    EXPECT_EQ(fact("0", "Cores"), "1");
    topology(3, "1", "3");
    cpu(3, "online", "0");
    EXPECT_THAT(names(), ElementsAre("0")) << "a socket of which all are off has nothing to tell";
}

TEST_F(Processors, SocketsAreInTheOrderOfTheirNumbers) {
    for (int number = 0; number < 12; ++number) {
        topology(number, std::to_string(number), std::to_string(number));
    }
    EXPECT_THAT(names(), ElementsAre("0", "1", "2", "3", "4", "5", "6", "7", "8", "9", "10", "11"));
}

TEST_F(Processors, ACacheThatIsSharedCountsOnce) {
    for (int number = 0; number < 4; ++number) {
        topology(number, "0", std::to_string(number));
        cpu(number, "cache/index0/level", "1");
        cpu(number, "cache/index0/type", "Data");
        cpu(number, "cache/index0/size", "32K");
        cpu(number, "cache/index1/level", "2");
        cpu(number, "cache/index1/type", "Unified");
        cpu(number, "cache/index1/size", "512K");
        cpu(number, "cache/index1/shared_cpu_list", number < 2 ? "0-1" : "2-3");
        cpu(number, "cache/index2/level", "1");
        cpu(number, "cache/index2/type", "Data");
        cpu(number, "cache/index2/size", "none");
    }
    EXPECT_EQ(fact("0", "Level1DataCache"), std::to_string(4 * 32 * 1024));
    EXPECT_EQ(fact("0", "Level2Cache"), std::to_string(2 * 512 * 1024));
    EXPECT_EQ(fact("0", "Level3Cache"), "");
}

TEST_F(Processors, CoresOfSeveralKindsAreAllNamed) {
    std::string info;
    for (int number = 0; number < 4; ++number) {
        topology(number, "0", std::to_string(number));
        cpu(number, "cpufreq/cpuinfo_max_freq", number < 2 ? "1500000" : "2000000");
        info += "processor\t: " + std::to_string(number) +
                "\nCPU implementer\t: 0x41\nCPU part\t: " + (number < 2 ? "0xd03" : "0xd08") + "\n\n";
    }
    recorded_.file("/proc/cpuinfo", info);
    EXPECT_EQ(fact("0", "Model"), "Cortex-A53, Cortex-A72");
    EXPECT_EQ(fact("0", "Maker"), "ARM");
    EXPECT_EQ(fact("0", "TopFrequency"), "2000000");
}

TEST_F(Processors, EachSocketHasTheModelOfItsOwn) {
    topology(0, "0", "0");
    topology(1, "1", "1");
    topology(10, "1", "10");
    recorded_.file("/proc/cpuinfo",
                   "processor\t: 0\nvendor_id\t: A\nmodel name\t: One\ncpu MHz\t\t: 1000.5\n\n"
                   "processor\t: 1\nvendor_id\t: B\nmodel name\t: Two \x1b[1m\nmicrocode\t: 0x7\ncpu "
                   "MHz\t\t: 2400.123456\n");
    EXPECT_EQ(fact("0", "Model"), "One");
    EXPECT_EQ(fact("0", "Frequency"), "1000500");
    EXPECT_EQ(fact("0", "Microcode"), "");
    EXPECT_EQ(fact("1", "Model"), "Two ?[1m");
    EXPECT_EQ(fact("1", "Maker"), "B");
    EXPECT_EQ(fact("1", "Frequency"), "2400123");
    EXPECT_EQ(fact("1", "Microcode"), "0x7");
}

TEST_F(Processors, WhatStandsForAllIsTold) {
    topology(0, "0", "0");
    recorded_.file("/proc/cpuinfo", "vendor_id : IBM/S390\n# processors : 1\ncpu : POWER9\ncpu MHz : odd");
    EXPECT_EQ(fact("0", "Maker"), "IBM/S390");
    EXPECT_EQ(fact("0", "Model"), "POWER9");
    EXPECT_EQ(fact("0", "Frequency"), "");
}

TEST_F(Processors, WeaknessesAreThoseItHas) {
    topology(0, "0", "0");
    recorded_.file("/sys/devices/system/cpu/vulnerabilities/a", "Not affected");
    recorded_.file("/sys/devices/system/cpu/vulnerabilities/b", "Vulnerable");
    recorded_.file("/sys/devices/system/cpu/vulnerabilities/c", "Mitigation: x");
    EXPECT_EQ(fact("0", "Weaknesses"), "b: Vulnerable | c: Mitigation: x");
}

TEST_F(Processors, ManyAreToldInTimeThatGrowsWithTheirNumber) {
    std::string info;
    for (int number = 0; number < 256; ++number) {
        topology(number, std::to_string(number / 128), std::to_string(number));
        info += "processor\t: " + std::to_string(number) + "\nmodel name\t: Many\n" + std::string(1200, 'x') +
                "\n\n";
    }
    recorded_.file("/proc/cpuinfo", info);
    const std::clock_t start = std::clock();
    EXPECT_EQ(fact("1", "Threads"), "128");
    EXPECT_EQ(fact("1", "Model"), "Many");
    EXPECT_LT(std::clock() - start, 2 * CLOCKS_PER_SEC);
}

}  // namespace
