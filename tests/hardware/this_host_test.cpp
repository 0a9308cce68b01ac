// The system, the processors and the memory of the host that the tests run on, beside what its tools tell.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/sysinfo.h>
#include <sys/utsname.h>
#include <unistd.h>

#include <algorithm>
#include <cmath>
#include <ctime>
#include <map>
#include <sstream>

#include "tests/hardware/recorded_host.h"
#include "tests/hardware/tools.h"
#include "tests/support/waiting.h"

namespace {

using hardware::Class;
using hardware_test::firstLine;
using hardware_test::printed;
using Json = nlohmann::json;

/// The sum of a property over all processors.
unsigned long long sum(const std::string& property) {
    const hardware::Host host;
    unsigned long long all = 0;
    for (const std::string& name : listed(host, Class::processor)) {
        all += hardware::asNumber(told(host, Class::processor, name, property)).value_or(0);
    }
    return all;
}

std::string firstProcessor(const std::string& property) {
    const hardware::Host host;
    return told(host, Class::processor, listed(host, Class::processor).front(), property);
}

std::string ofSystem(const std::string& property) {
    return told(hardware::Host("", true), Class::system, "", property);
}

TEST(ThisHost, ProcessorsAreThoseOfTheKernel) {
    EXPECT_EQ(sum("Threads"), static_cast<unsigned long long>(sysconf(_SC_NPROCESSORS_ONLN)));
    EXPECT_GE(sum("Threads"), sum("Cores"));
}

TEST(ThisHost, ProcessorsAreThoseOfLscpu) {
    auto fields = hardware_test::lscpu("");
    if (fields.empty()) {
        GTEST_SKIP() << "no lscpu";
    }
    const auto compare = [&](const std::string& field, const std::string& own) {
        if (!fields[field].empty()) {
            EXPECT_EQ(own, fields[field].substr(0, fields[field].find(" ("))) << field;
        }
    };
    EXPECT_EQ(std::to_string(sum("Threads")), fields["CPU(s):"]);
    EXPECT_EQ(ofSystem("ProcessorSockets"), fields["Socket(s):"]);
    EXPECT_EQ(sum("Cores"), std::stoull(fields["Core(s) per socket:"]) * std::stoull(fields["Socket(s):"]));
    EXPECT_EQ(ofSystem("Architecture"), fields["Architecture:"]);
    EXPECT_EQ(ofSystem("Virtual"), fields["Hypervisor vendor:"].empty() ? "false" : "true");
    EXPECT_EQ(firstProcessor("Maker"), fields["Vendor ID:"]);
    EXPECT_EQ(firstProcessor("Model"), fields["Model name:"]);
    EXPECT_EQ(firstProcessor("TopFrequency"), hardware_test::kilohertz(fields["CPU max MHz:"]));
    for (const auto& [field, property] : {std::pair{"L1d cache:", "Level1DataCache"},
                                          {"L1i cache:", "Level1InstructionCache"},
                                          {"L2 cache:", "Level2Cache"},
                                          {"L3 cache:", "Level3Cache"}}) {
        compare(field, std::to_string(sum(property)));
    }
}

TEST(ThisHost, WeaknessesAreThoseOfLscpu) {
    const auto fields = hardware_test::lscpu("");
    if (fields.empty()) {
        GTEST_SKIP() << "no lscpu";
    }
    EXPECT_THAT(hardware_test::ownWeaknesses(hardware::Host()),
                testing::UnorderedElementsAreArray(hardware_test::weaknesses(fields)));
}

TEST(ThisHost, TheFrequencyIsNearThatOfLscpu) {
    const std::string first = firstLine("LC_ALL=C lscpu -e=MHZ | sed 1d");
    if (first.find_first_of("123456789") == std::string::npos) {
        GTEST_SKIP() << "no lscpu, or it knows of no frequency";
    }
    EXPECT_TRUE(eventually([&] {  // it goes up and down
        const double theirs = std::stod(firstLine("LC_ALL=C lscpu -e=MHZ | sed 1d")) * 1000;
        return std::abs(std::stod("0" + firstProcessor("Frequency")) - theirs) < theirs / 10;
    }));
}

/// lshw's row for the first processor; null where it is not installed.
Json processorOfLshw() {
    Json rows = hardware_test::printedJson("lshw -json -quiet -class processor");
    return rows.is_array() && !rows.empty() ? rows.front() : Json();
}

TEST(ThisHost, MicrocodeIsThatOfLshw) {
    const Json row = processorOfLshw();
    if (!row.contains("configuration") || !row["configuration"].contains("microcode")) {
        GTEST_SKIP() << "no lshw, or it tells of no microcode";
    }
    const std::string theirs = row["configuration"]["microcode"];
    EXPECT_EQ(hardware::asNumber(firstProcessor("Microcode")), hardware::asNumber(theirs));
}

/// The numbers in a row of free -b.
std::vector<unsigned long long> numbersOfFree(const std::string& row) {
    std::istringstream lines(printed("LC_ALL=C free -b"));
    std::vector<unsigned long long> numbers;
    for (std::string line; std::getline(lines, line);) {
        if (line.starts_with(row)) {
            std::istringstream words(line.substr(row.size()));
            for (unsigned long long number = 0; words >> number;) {
                numbers.push_back(number);
            }
        }
    }
    return numbers;
}

TEST(ThisHost, MemoryIsThatOfFree) {
    if (numbersOfFree("Mem:").size() < 6) {
        GTEST_SKIP() << "no free";
    }
    const auto own = [](const char* property) {
        return hardware::asNumber(told(hardware::Host(), Class::memory, "", property)).value_or(0);
    };
    EXPECT_EQ(own("TotalMemory"), numbersOfFree("Mem:")[0]);
    EXPECT_EQ(own("TotalSwap"), numbersOfFree("Swap:")[0]);
    // Others use and leave memory between two looks.
    constexpr double kBetween = 64e6;
    const auto near = [&](const char* property, const char* row, std::size_t column) {
        return std::abs(static_cast<double>(own(property)) -
                        static_cast<double>(numbersOfFree(row)[column])) < kBetween;
    };
    EXPECT_TRUE(eventually([&] { return near("AvailableMemory", "Mem:", 5); }));
    EXPECT_TRUE(eventually([&] { return near("FreeSwap", "Swap:", 2); }));
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
    utsname names{};
    ASSERT_EQ(uname(&names), 0);
    EXPECT_EQ(ofSystem("Kernel"), names.release);
    struct sysinfo info {};
    ASSERT_EQ(sysinfo(&info), 0);
    const auto boot = static_cast<double>(std::time(nullptr) - info.uptime);
    EXPECT_NEAR(std::stod(ofSystem("BootTime")), boot, 60);
}

TEST(ThisHost, DistributionIsWhatAShellReads) {
    EXPECT_EQ(ofSystem("Distribution"), firstLine(". /etc/os-release && echo \"$PRETTY_NAME\""));
}

/// Who runs the machine, by the words of systemd-detect-virt; others of its words are not compared.
TEST(ThisHost, IsVirtualWhereSystemdSaysSo) {
    static const std::map<std::string, std::string> kinds = {
        {"kvm", "KVM"},           {"qemu", "QEMU"},  {"vmware", "VMware"}, {"oracle", "VirtualBox"},
        {"microsoft", "Hyper-V"}, {"xen", "Xen"},    {"bochs", "Bochs"},   {"parallels", "Parallels"},
        {"amazon", "KVM"},        {"google", "KVM"}, {"none", ""}};
    const std::string theirs = firstLine("systemd-detect-virt --vm");
    if (theirs.empty()) {
        GTEST_SKIP() << "no systemd-detect-virt";
    }
    EXPECT_EQ(ofSystem("Virtual"), theirs == "none" ? "false" : "true");
    if (const std::string own = ofSystem("VirtualKind"); !own.empty() && kinds.contains(theirs)) {
        EXPECT_EQ(own, kinds.at(theirs));
    }
}

TEST(ThisHost, FirmwareTellsWhatDmidecodeReads) {
    if (geteuid() != 0 || access("/sys/class/dmi/id", R_OK) != 0 || printed("dmidecode -q").empty()) {
        GTEST_SKIP() << "no table of the firmware, or no dmidecode that may read it";
    }
    for (const auto& [property, word] : {std::pair{"Maker", "system-manufacturer"},
                                         {"Model", "system-product-name"},
                                         {"SerialNumber", "system-serial-number"},
                                         {"FirmwareVersion", "bios-version"},
                                         {"FirmwareDate", "bios-release-date"},
                                         {"UUID", "system-uuid"}}) {
        const std::string theirs = hardware::trimmed(firstLine(std::string("dmidecode -s ") + word));
        if (const std::string own = ofSystem(property); !own.empty()) {  // words for "nothing" are left out
            EXPECT_EQ(own, theirs) << property;
        }
    }
}

}  // namespace
