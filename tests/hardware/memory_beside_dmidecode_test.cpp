// Memory modules beside what dmidecode reads from the same tables: those of the recorded hosts, one with a
// module of every kind, and this host's own.
#include <gtest/gtest.h>
#include <unistd.h>

#include <fstream>
#include <set>
#include <sstream>

#include "tests/hardware/recorded_hosts.h"
#include "tests/hardware/storage_host.h"
#include "tests/hardware/tools.h"

namespace {

using hardware::Class;
using Facts = std::map<std::string, std::string>;

const std::string kTables = "/sys/firmware/dmi/tables/DMI";

/// An entry point as dmidecode --dump-bin writes it: the table stands 32 bytes behind it.
std::string entryPoint(std::size_t size) {
    std::string bytes("_SM3_\0\x18\x03\x03\0\x01\0", 12);
    for (unsigned int shift = 0; shift < 32; shift += 8) {
        bytes += static_cast<char>(size >> shift & 0xffU);
    }
    bytes += std::string("\x20\0\0\0\0\0\0\0", 8);
    unsigned int sum = 0;
    for (const char byte : bytes) {
        sum += static_cast<unsigned char>(byte);
    }
    bytes[5] = static_cast<char>(0x100 - (sum & 0xffU));
    return bytes + std::string(8, '\0');
}

/// "16 GB" in bytes; "" for what is none.
std::string bytesOf(const std::string& size) {
    static const std::map<std::string, unsigned int> kShifts = {{"bytes", 0}, {"kB", 10}, {"MB", 20},
                                                                {"GB", 30},   {"TB", 40}, {"PB", 50}};
    std::istringstream words(size);
    unsigned long long count = 0;
    std::string unit;
    return words >> count >> unit && kShifts.contains(unit) ? std::to_string(count << kShifts.at(unit)) : "";
}

/// What dmidecode tells of the memory devices that hold something, in their order.
std::vector<Facts> devicesOf(const std::string& options) {
    std::istringstream lines(hardware_test::printed("dmidecode -t 17 " + options));
    std::vector<Facts> all;
    for (std::string line; std::getline(lines, line);) {
        if (line == "Memory Device") {
            all.emplace_back();
        }
        const std::size_t colon = line.find(": ");
        if (!all.empty() && line.starts_with('\t') && colon != std::string::npos) {
            all.back()[line.substr(1, colon - 1)] = hardware::trimmed(line.substr(colon + 2));
        }
    }
    std::erase_if(all, [](Facts& facts) { return bytesOf(facts["Size"]).empty(); });
    return all;
}

/// Words for nothing: the plug-in leaves such properties out.
bool isNothing(const std::string& text) {
    static const std::set<std::string> kWords = {"",      "Not Specified", "Unknown", "None",
                                                 "Other", "NO DIMM",       "Reserved"};
    return kWords.contains(text) || text.starts_with("<OUT OF SPEC>");
}

void expectSame(const hardware::Host& host, const std::string& name, Facts theirs) {
    SCOPED_TRACE("module " + name);
    Facts own = hardware_test::factsOf(host, Class::memoryModule, name);
    const std::string speed =
        theirs[isNothing(theirs["Configured Memory Speed"]) ? "Speed" : "Configured Memory Speed"];
    theirs["Speed"] = speed.substr(0, speed.find(" MT/s"));
    theirs["Size"] = bytesOf(theirs["Size"]);
    for (const auto& [property, row] : {std::pair{"Slot", "Locator"},
                                        {"Bank", "Bank Locator"},
                                        {"Size", "Size"},
                                        {"MemoryType", "Type"},
                                        {"Speed", "Speed"},
                                        {"Maker", "Manufacturer"},
                                        {"PartNumber", "Part Number"},
                                        {"SerialNumber", "Serial Number"}}) {
        if (!own[property].empty() || !isNothing(theirs[row])) {
            EXPECT_EQ(own[property], theirs[row]) << property;
        }
    }
}

void expectSame(const hardware::Host& host, const std::vector<Facts>& theirs) {
    const std::vector<std::string> own = listed(host, Class::memoryModule);
    ASSERT_EQ(own.size(), theirs.size());
    for (std::size_t at = 0; at < own.size(); ++at) {
        expectSame(host, own[at], theirs[at]);
    }
}

/// Compares a recorded host's table.
void compare(const RecordedHost& recorded) {
    if (hardware_test::printed("dmidecode --version").empty()) {
        GTEST_SKIP() << "no dmidecode";
    }
    const std::string table = recorded.host().text(kTables).value_or("");
    const std::string dump = recorded.root() + "/dump";
    std::ofstream(dump, std::ios::binary) << entryPoint(table.size()) << table;
    expectSame(recorded.host(), devicesOf("--from-dump " + dump));
}

class RecordedModules : public testing::TestWithParam<std::string> {};

TEST_P(RecordedModules, AreThoseOfDmidecode) {
    const RecordedHost recorded;
    recorded.unpack(recordedHosts() + "/" + GetParam() + "/files");
    if (recorded.host().exists(kTables)) {
        compare(recorded);
    }
}

INSTANTIATE_TEST_SUITE_P(All, RecordedModules, testing::ValuesIn(namesOfRecordedHosts()), nameOfTest);

/// A module with a kind, a size word and speeds of its own, and texts.
std::string module(unsigned char kind, unsigned int size, unsigned int speed, unsigned int configured) {
    std::string fixed(0x5c, '\0');
    const auto word = [&fixed](std::size_t at, unsigned int value) {
        fixed[at] = static_cast<char>(value & 0xffU);
        fixed[at + 1] = static_cast<char>(value >> 8U & 0xffU);
    };
    fixed[0] = 17;
    fixed[1] = 0x5c;
    word(0x02, 0x1100U + kind);
    word(0x0c, size);
    fixed[0x12] = static_cast<char>(kind);
    word(0x15, speed);
    word(0x1c, 65536U + kind);
    word(0x1e, 1);
    word(0x20, configured);
    fixed[0x10] = 1;
    fixed[0x17] = 2;
    fixed[0x18] = 3;
    return fixed + "SLOT " + std::to_string(kind) + '\0' + "Maker" + '\0' + "S" + std::to_string(kind) +
           '\0' + '\0';
}

TEST(ModulesOfEveryKind, AreThoseOfDmidecode) {
    constexpr unsigned char kLast = 0x23;  // of those that dmidecode 3.4 knows
    constexpr std::array<unsigned int, 6> kSizes = {16384, 0x8200, 0x7fff, 0, 0xffff, 3};
    std::string table;
    for (unsigned char kind = 1; kind <= kLast; ++kind) {
        table += module(kind, kSizes[kind % kSizes.size()], 3200, kind % 2 == 0 ? 2933 : 0);
    }
    const RecordedHost recorded;
    recorded.file(kTables, table);
    compare(recorded);
}

TEST(ThisHostsModules, AreThoseOfDmidecode) {
    const hardware::Host host("", true);
    if (geteuid() != 0 || !host.text(kTables) || hardware_test::printed("dmidecode --version").empty()) {
        GTEST_SKIP() << "no table of the firmware, or no dmidecode that may read it";
    }
    expectSame(host, devicesOf(""));
}

}  // namespace
