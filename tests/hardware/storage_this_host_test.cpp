// Drives, partitions and file systems of the machine that the tests run on, beside what lsblk says of them.
#include <gmock/gmock.h>
#include <unistd.h>

#include <array>
#include <filesystem>
#include <nlohmann/json.hpp>
#include <set>
#include <sstream>

#include "tests/hardware/storage_host.h"
#include "tests/hardware/tools.h"

namespace {

using hardware::Class;
using hardware_test::factsOf;
using Json = nlohmann::json;

class ThisHostsStorage : public testing::Test {
protected:
    ThisHostsStorage() {
        const Json all = hardware_test::printedJson("lsblk --json --bytes --output-all --list");
        if (all.is_object()) {
            rows_ = all.at("blockdevices");
        }
        const auto access = std::make_shared<hardware_test::FakeDevices>();  // drives are left alone here
        access->space = [own = hardware::ownDevices()](const std::string& where) { return own->room(where); };
        host_ = hardware::Host("", true, std::make_shared<hardware::Devices>(access));
    }
    void SetUp() override {
        if (rows_.empty()) {
            GTEST_SKIP() << "no lsblk here";
        }
    }

    /// lsblk's row for a device; an empty object where it leaves one out.
    Json row(const std::string& name) const {
        for (const Json& one : rows_) {
            if (one.at("kname") == name) {
                return one;
            }
        }
        return Json::object();
    }
    void expectSame(const std::map<std::string, std::string>& facts, const char* ours,
                    const Json& theirs) const {
        if (theirs.is_null() || theirs == "") {
            return;
        }
        std::string text = theirs.is_string() ? theirs.get<std::string>() : theirs.dump();
        text.erase(text.find_last_not_of(' ') + 1);
        EXPECT_EQ(facts.contains(ours) ? facts.at(ours) : "nothing", text) << ours;
    }

    Json rows_ = Json::array();
    hardware::Host host_;
};

TEST_F(ThisHostsStorage, DrivesAreThoseOfLsblk) {
    std::set<std::string> expected;
    for (const Json& one : rows_) {
        const std::string name = one.at("kname");
        const bool attached = std::filesystem::exists("/sys/class/block/" + name + "/device");
        if ((one.at("type") == "disk" || one.at("type") == "rom") && attached) {
            expected.insert(name);
        }
    }
    std::set<std::string> drives;
    for (const std::string& name : listed(host_, Class::drive)) {
        if (factsOf(host_, Class::drive, name).contains("Size")) {  // lsblk leaves empty ones out
            drives.insert(name);
        }
    }
    EXPECT_EQ(drives, expected);
}

TEST_F(ThisHostsStorage, WhatDrivesAreIsWhatLsblkSays) {
    for (const std::string& name : listed(host_, Class::drive)) {
        SCOPED_TRACE(name);
        const Json theirs = row(name);
        if (theirs.empty()) {
            continue;
        }
        const auto facts = factsOf(host_, Class::drive, name);
        for (const auto& [ours, column] : std::map<const char*, const char*>{{"Size", "size"},
                                                                             {"LogicalBlockSize", "log-sec"},
                                                                             {"PhysicalBlockSize", "phy-sec"},
                                                                             {"Rotational", "rota"},
                                                                             {"Removable", "rm"},
                                                                             {"ReadOnly", "ro"},
                                                                             {"Model", "model"},
                                                                             {"SerialNumber", "serial"},
                                                                             {"FirmwareVersion", "rev"},
                                                                             {"Transport", "tran"},
                                                                             {"WWN", "wwn"}}) {
            expectSame(facts, ours, theirs.at(column));
        }
    }
}

TEST_F(ThisHostsStorage, PartitionsAreThoseOfLsblk) {
    for (const std::string& name : listed(host_, Class::partition)) {
        SCOPED_TRACE(name);
        const Json theirs = row(name);
        ASSERT_FALSE(theirs.empty());
        const auto facts = factsOf(host_, Class::partition, name);
        EXPECT_EQ(theirs.at("type"), "part");
        expectSame(facts, "Size", theirs.at("size"));
        expectSame(facts, "Label", theirs.at("partlabel"));
        expectSame(facts, "UUID", theirs.at("partuuid"));
        expectSame(facts, "PartitionType", theirs.at("parttype"));
        if (theirs.contains("start") && theirs.at("start").is_number()) {
            EXPECT_EQ(facts.at("Start"), std::to_string(theirs.at("start").get<unsigned long long>() * 512));
        }
    }
}

/// Completed reads, sectors read, writes and sectors written, by device.
std::map<std::string, std::array<std::string, 4>> countedByVmstat() {
    std::istringstream lines(hardware_test::printed("LC_ALL=C vmstat -d"));
    std::map<std::string, std::array<std::string, 4>> all;
    for (std::string line; std::getline(lines, line);) {
        std::istringstream words(line);
        std::string name;
        std::string other;
        std::array<std::string, 4> counts;
        words >> name >> counts[0] >> other >> counts[1] >> other >> counts[2] >> other >> counts[3];
        all[name] = counts;
    }
    return all;
}

TEST_F(ThisHostsStorage, TransfersAreThoseOfVmstat) {
    if (countedByVmstat().empty()) {
        GTEST_SKIP() << "no vmstat";
    }
    std::map<std::string, std::map<std::string, std::string>> before;
    for (const std::string& name : listed(host_, Class::drive)) {
        before[name] = factsOf(host_, Class::drive, name);
    }
    const auto counted = countedByVmstat();
    for (const auto& [name, facts] : before) {
        SCOPED_TRACE(name);
        const auto after = factsOf(host_, Class::drive, name);
        std::size_t at = 0;
        for (const auto& [property, unit] :
             {std::pair{"Reads", 1}, {"ReadBytes", 512}, {"Writes", 1}, {"WrittenBytes", 512}}) {
            const unsigned long long theirs = std::stoull(counted.at(name)[at++]) * unit;
            EXPECT_LE(std::stoull(facts.at(property)), theirs) << property;
            EXPECT_GE(std::stoull(after.at(property)), theirs) << property;
        }
    }
}

TEST_F(ThisHostsStorage, FileSystemsAreMountedWhereLsblkSees) {
    if (host_.text("/proc/self/mountinfo") != host_.text("/proc/1/mountinfo")) {
        GTEST_SKIP() << "lsblk sees other mounts than the first process";
    }
    for (const std::string& name : listed(host_, Class::fileSystem)) {
        SCOPED_TRACE(name);
        const Json theirs = row(name);
        ASSERT_FALSE(theirs.empty());
        const auto facts = factsOf(host_, Class::fileSystem, name);
        expectSame(facts, "FileSystemType", theirs.at("fstype"));
        expectSame(facts, "Label", theirs.at("label"));
        expectSame(facts, "UUID", theirs.at("uuid"));
        expectSame(facts, "Size", theirs.at("fssize"));
        if (theirs.at("fsavail").is_number() && facts.contains("Free")) {
            constexpr double kBetween = 1e9;  // lsblk looked before, and others fill it meanwhile
            EXPECT_NEAR(std::stod(facts.at("Free")), theirs.at("fsavail").get<double>(), kBetween);
        }
        for (const Json& place : theirs.at("mountpoints")) {
            EXPECT_TRUE(
                place.is_null() || place == "[SWAP]" ||
                (" | " + facts.at("MountPoints") + " | ").find(" | " + place.get<std::string>() + " | ") !=
                    std::string::npos)
                << place;
        }
    }
}

}  // namespace
