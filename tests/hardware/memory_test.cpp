// Memory as the kernel counts it, and its modules from tables of honest, careless and lying firmware.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdint>
#include <ctime>

#include "plugins/hardware/memory/smbios.h"
#include "tests/hardware/recorded_host.h"

namespace {

using hardware::Class;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;

const std::string kTableFile = "/sys/firmware/dmi/tables/DMI";

/// A structure with its texts.
class Structure {
public:
    explicit Structure(std::uint8_t type, std::size_t length = 0x5c) : bytes_(length, '\0') {
        set(0, type);
        set(1, static_cast<std::uint8_t>(length));
    }
    Structure& set(std::size_t offset, std::uint8_t value) {
        bytes_[offset] = static_cast<char>(value);
        return *this;
    }
    Structure& word(std::size_t offset, std::uint32_t value) {
        return set(offset, value & 0xffU).set(offset + 1, (value >> 8U) & 0xffU);
    }
    Structure& doubleWord(std::size_t offset, std::uint32_t value) {
        return word(offset, value & 0xffffU).word(offset + 2, value >> 16U);
    }
    Structure& text(std::size_t offset, const std::string& text) {
        texts_ += text + '\0';
        return set(offset, ++count_);
    }
    std::string bytes() const { return bytes_ + (texts_.empty() ? std::string(1, '\0') : texts_) + '\0'; }

private:
    std::string bytes_;
    std::string texts_;
    std::uint8_t count_ = 0;
};

Structure module(std::uint32_t mebibytes) {
    return Structure(17).word(0x0c, mebibytes);
}

class Modules : public testing::Test {
protected:
    void table(const std::string& bytes) const { recorded_.file(kTableFile, bytes); }
    std::string fact(const std::string& property, bool privileged = true) const {
        return told(recorded_.host(privileged), Class::memoryModule, "0", property);
    }
    std::size_t count() const { return listed(recorded_.host(), Class::memoryModule).size(); }

    RecordedHost recorded_;
};

TEST_F(Modules, AreToldWithAllThatTheTableHas) {
    table(module(16384)
              .set(0x12, 0x1a)
              .word(0x15, 3200)
              .word(0x20, 2933)
              .text(0x10, "DIMM_A1")
              .text(0x11, "NODE 1")
              .text(0x17, "Maker")
              .text(0x18, "12345678")
              .text(0x1a, "PART-1   ")
              .bytes());
    EXPECT_EQ(
        told(recorded_.host(), Class::memoryModule, "0"),
        "Slot: DIMM_A1\nBank: NODE 1\nSize: 17179869184 bytes\nMemoryType: DDR4\n"
        "Speed: 2933 megatransfers per second\nMaker: Maker\nPartNumber: PART-1\nSerialNumber: 12345678\n");
    EXPECT_EQ(fact("SerialNumber", false), "");
}

TEST_F(Modules, HaveTheSizeInTheUnitThatTheTableNames) {
    const auto size = [this](const Structure& structure) {
        table(structure.bytes());
        return fact("Size");
    };
    EXPECT_EQ(size(module(0x8000U | 512)), std::to_string(512 * 1024)) << "in kibibytes";
    EXPECT_EQ(size(module(0x7fff).doubleWord(0x1c, 65536)), std::to_string(65536ULL << 20U));
    EXPECT_EQ(size(module(0x7fff).doubleWord(0x1c, 0x80000000U | 65536)), std::to_string(65536ULL << 20U));
    EXPECT_EQ(size(module(0x7ffe)), std::to_string(0x7ffeULL << 20U));
}

TEST_F(Modules, WithoutASizeAreEmptySlots) {
    table(module(0).bytes() + module(0xffff).bytes() + module(0x8000).bytes() + module(0x7fff).bytes() +
          Structure(17, 0x0d).bytes() + Structure(16).bytes() + module(1).bytes());
    EXPECT_EQ(count(), 1U);
}

TEST_F(Modules, HaveTheSpeedTheyAreRunWith) {
    const auto speed = [this](const Structure& structure) {
        table(structure.bytes());
        return fact("Speed");
    };
    EXPECT_EQ(speed(module(1).word(0x15, 3200)), "3200") << "where it is not told, the speed they can have";
    EXPECT_EQ(speed(module(1).word(0x20, 0xffff).doubleWord(0x58, 70000)), "70000");
    EXPECT_EQ(speed(module(1).word(0x20, 0xffff)), "");
    EXPECT_EQ(speed(module(1)), "");
}

TEST_F(Modules, WordsThatStandForNothingAreNotTold) {
    table(module(1)
              .text(0x10, "")
              .text(0x17, "Unknown")
              .text(0x18, "Not Specified")
              .text(0x1a, "NO DIMM")
              .bytes());
    EXPECT_EQ(told(recorded_.host(), Class::memoryModule, "0"), "Size: 1048576 bytes\n");
}

TEST_F(Modules, TextsAreShownWithoutControlCharacters) {
    table(module(1).text(0x10, "A\x1b[2J\xff").bytes());
    EXPECT_EQ(fact("Slot"), "A?[2J?");
}

TEST_F(Modules, TextsThatAreNotThereAreNotTold) {
    table(module(1).set(0x10, 200).bytes());
    EXPECT_EQ(fact("Slot"), "");
    table(Structure(17, 0x15).word(0x0c, 1).bytes());
    EXPECT_EQ(told(recorded_.host(), Class::memoryModule, "0"), "Size: 1048576 bytes\n");
}

TEST_F(Modules, NamesThatAreNoneHaveNoFacts) {
    table(module(1).bytes());
    for (const char* name : {"", "1", "-1", "x", "99999999999999999999"}) {
        EXPECT_EQ(told(recorded_.host(), Class::memoryModule, name), "") << name;
    }
}

TEST_F(Modules, ATableThatLiesAboutTheirNumberCostsLittle) {
    std::string bytes;
    for (int count = 0; count < 50000; ++count) {
        bytes += Structure(17, 0x0e).word(0x0c, 1).bytes();
    }
    table(bytes);
    const std::clock_t start = std::clock();
    EXPECT_EQ(count(), 4096U);
    EXPECT_LT(std::clock() - start, 2 * CLOCKS_PER_SEC);
}

TEST(SmbiosTable, EndsAtItsEndMark) {
    const std::string end = Structure(127, 4).bytes();
    EXPECT_THAT(hardware::readSmbios(module(1).bytes() + end + module(2).bytes()), SizeIs(1));
    EXPECT_THAT(hardware::readSmbios(""), IsEmpty());
}

TEST(SmbiosTable, CutOffAnywhereHasTheStructuresBeforeTheCut) {
    const std::string whole = module(1).text(0x10, "A").bytes();
    const std::string table = whole + module(2).text(0x10, "B").text(0x11, "C").bytes();
    for (std::size_t length = 0; length <= table.size(); ++length) {
        const auto records = hardware::readSmbios(table.substr(0, length));
        EXPECT_LE(records.size(), 2U);
        EXPECT_GE(records.size(), length >= whole.size() ? 1U : 0U) << length;
    }
}

TEST(SmbiosTable, WithAStructureThatIsTooShortEndsThere) {
    for (const std::uint8_t length : {0, 1, 3}) {
        std::string broken = module(1).bytes();
        broken[1] = static_cast<char>(length);
        EXPECT_THAT(hardware::readSmbios(broken + module(2).bytes()), IsEmpty());
    }
}

TEST(SmbiosTable, OnlyTextsThatAByteCanNameAreKept) {
    std::string bytes = Structure(17, 0x20).set(0x10, 255).bytes();
    bytes.resize(0x20);
    for (int count = 1; count <= 100000; ++count) {
        bytes += std::to_string(count) + '\0';
    }
    bytes += '\0';
    const auto records = hardware::readSmbios(bytes);
    ASSERT_THAT(records, SizeIs(1));
    EXPECT_EQ(records[0].text(0x10), "255");
}

TEST(SmbiosRecord, AnswersNothingBeyondItsEnd) {
    const hardware::SmbiosRecord record(17, std::string("\x11\x06\x00\x00\x34\x12", 6), {"A"});
    EXPECT_EQ(record.word(4), 0x1234);
    EXPECT_EQ(record.byte(5), 0x12);
    EXPECT_EQ(record.word(5), std::nullopt);
    EXPECT_EQ(record.doubleWord(3), std::nullopt);
    EXPECT_EQ(record.byte(SIZE_MAX), std::nullopt);
    EXPECT_EQ(record.word(SIZE_MAX), std::nullopt);
    EXPECT_EQ(record.text(4), std::nullopt);
}

class MemoryCounts : public testing::Test {
protected:
    std::string fact(const std::string& property) const {
        return told(recorded_.host(), Class::memory, "", property);
    }
    RecordedHost recorded_;
};

TEST_F(MemoryCounts, AreInBytes) {
    recorded_.file("/proc/meminfo",
                   "MemTotal:        1000 kB\nMemAvailable: 500 kB\nSwapTotal: 0 kB\nHugePages_Total: 7");
    EXPECT_EQ(fact("TotalMemory"), "1024000");
    EXPECT_EQ(fact("AvailableMemory"), "512000");
    EXPECT_EQ(fact("TotalSwap"), "0");
    EXPECT_EQ(fact("FreeSwap"), "");
}

TEST_F(MemoryCounts, ThatAreNoneAreNotTold) {
    for (const char* row : {"MemTotal: 5", "MemTotal: kB", "MemTotal:-5 kB", "XMemTotal: 5 kB",
                            "MemTotal: 18446744073709551615 kB", "MemTotal"}) {
        recorded_.file("/proc/meminfo", row);
        EXPECT_EQ(fact("TotalMemory"), "") << row;
    }
}

TEST_F(MemoryCounts, ErrorsAreThoseOfAllControllers) {
    EXPECT_EQ(fact("CorrectedErrors"), "");
    recorded_.file("/sys/devices/system/edac/mc/mc0/ce_count", "3");
    recorded_.file("/sys/devices/system/edac/mc/mc1/ce_count", "4");
    recorded_.file("/sys/devices/system/edac/mc/mc2/ce_count", "broken");
    EXPECT_EQ(fact("CorrectedErrors"), "7");
    EXPECT_EQ(fact("UncorrectedErrors"), "");
}

}  // namespace
