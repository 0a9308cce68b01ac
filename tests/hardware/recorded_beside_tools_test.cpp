// The recorded hosts beside what lscpu, lsblk, sensors and dmidecode tell of the same files.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <sstream>

#include "tests/hardware/recorded_hosts.h"
#include "tests/hardware/storage_host.h"
#include "tests/hardware/tools.h"

namespace {

namespace fs = std::filesystem;
using hardware::Class;
using hardware_test::factsOf;
using hardware_test::printed;
using hardware_test::printedJson;
using Json = nlohmann::json;
using Facts = std::map<std::string, std::string>;

class RecordedBesideTools : public testing::TestWithParam<std::string> {
protected:
    RecordedBesideTools() { recorded_.unpack(recordedHosts() + "/" + GetParam() + "/files"); }

    hardware::Host host() const { return recorded_.host(); }
    std::vector<std::string> names(Class type) const { return listed(host(), type); }
    bool has(const std::string& path) const { return host().exists(path); }
    /// What lscpu and lsblk read besides: lists of processors, devices by their numbers, udev's facts in
    /// /dev.
    void addWhatToolsRead() const;
    void addBlock(const std::string& name) const;

    const RecordedHost recorded_;
};

void RecordedBesideTools::addBlock(const std::string& name) const {
    const std::string own = "/sys/class/block/" + name;
    const std::string target = host().resolved(own).value_or("");
    if (!has(own + "/partition")) {
        recorded_.link("/sys/block/" + name, "../.." + target);
    }
    if (const auto number = host().line(own + "/dev")) {
        recorded_.link("/sys/dev/block/" + *number, "../../.." + target);
        std::string facts;
        for (const std::string& line : host().lines("/run/udev/data/b" + *number)) {
            facts += line.starts_with("E:") ? line.substr(2) + "\n" : "";
        }
        recorded_.file("/dev/" + name, facts);
    }
}

void RecordedBesideTools::addWhatToolsRead() const {
    const std::string all = "/sys/devices/system/cpu/";
    std::string present;
    std::string online;
    for (const std::string& name : host().entries(all)) {
        const auto number = name.starts_with("cpu") ? hardware::asNumber(name.substr(3)) : std::nullopt;
        const std::string more = number ? "," + std::to_string(*number) : "";
        present += more;
        online += host().flag(all + name + "/online") == false ? "" : more;
    }
    for (const auto& [file, list] :
         {std::pair{"possible", present}, {"present", present}, {"online", online}}) {
        if (!list.empty()) {
            recorded_.file(all + file, list.substr(1));
        }
    }
    for (const std::string& name : host().entries("/sys/class/block")) {
        addBlock(name);
    }
}

/// How many numbers "0-3,7" stands for.
unsigned long long countOf(const std::string& list) {
    unsigned long long count = 0;
    std::istringstream ranges(list);
    for (std::string range; std::getline(ranges, range, ',');) {
        const std::size_t dash = range.find('-');
        const auto first = std::stoull(range);
        count += dash == std::string::npos ? 1 : std::stoull(range.substr(dash + 1)) - first + 1;
    }
    return count;
}

TEST_P(RecordedBesideTools, ProcessorsAreThoseOfLscpu) {
    addWhatToolsRead();
    auto fields = hardware_test::lscpu("--sysroot " + recorded_.root());
    const std::vector<std::string> processors = names(Class::processor);
    if (processors.empty()) {
        return;
    }
    if (fields.empty()) {
        GTEST_SKIP() << "no lscpu";
    }
    const Facts first = factsOf(host(), Class::processor, processors.front());
    unsigned long long threads = 0;
    unsigned long long top = 0;
    for (const std::string& name : processors) {
        const Facts facts = factsOf(host(), Class::processor, name);
        threads += hardware::asNumber(facts.at("Threads")).value_or(0);
        top = facts.contains("TopFrequency") ? std::max(top, std::stoull(facts.at("TopFrequency"))) : top;
    }
    const auto expectSame = [&](const char* property, const char* field) {
        if (!fields[field].empty() && fields[field] != "-") {
            EXPECT_EQ(first.contains(property) ? first.at(property) : "nothing", fields[field]) << property;
        }
    };
    expectSame("Maker", "Vendor ID:");
    expectSame("Model", "Model name:");
    EXPECT_EQ(top == 0 ? "" : std::to_string(top), hardware_test::kilohertz(fields["CPU max MHz:"]));
    EXPECT_EQ(threads, countOf(fields["On-line CPU(s) list:"]));
    EXPECT_THAT(hardware_test::ownWeaknesses(host()),
                testing::UnorderedElementsAreArray(hardware_test::weaknesses(fields)));
}

constexpr const char* kSize = "size";

/// What lsblk tells beside the names of the plug-in's properties, of drives and of partitions.
using Columns = std::map<const char*, const char*>;
const Columns kOfDrives = {{"Size", kSize},
                           {"LogicalBlockSize", "log-sec"},
                           {"PhysicalBlockSize", "phy-sec"},
                           {"Rotational", "rota"},
                           {"Removable", "rm"},
                           {"ReadOnly", "ro"},
                           {"Transport", "tran"},
                           {"Maker", "vendor"},
                           {"Model", "model"},
                           {"SerialNumber", "serial"},
                           {"FirmwareVersion", "rev"},
                           {"WWN", "wwn"}};
const Columns kOfPartitions = {
    {"Size", kSize}, {"Label", "partlabel"}, {"UUID", "partuuid"}, {"PartitionType", "parttype"}};
const Columns kOfFileSystems = {{"FileSystemType", "fstype"}, {"Label", "label"}, {"UUID", "uuid"}};

/// The word for all ATA drives and numbers of PCI vendors are no makers.
bool isNoMaker(const std::string& property, const std::string& text) {
    return property == "Maker" && (text == "ATA" || text.starts_with("0x"));
}

/// The kernel's SCSI layer cuts off what ATA drives tell.
bool mayBeCutOff(const Json& row, const std::string& property) {
    return row.at("vendor") == "ATA     " && (property == "Model" || property == "FirmwareVersion");
}

void expectColumns(const Facts& own, const Json& row, const Columns& columns) {
    for (const auto& [property, column] : columns) {
        const Json& theirs = row.at(column);
        const std::string text = hardware::printable(
            hardware::trimmed(theirs.is_string() ? theirs.get<std::string>() : theirs.dump()));
        const std::string fact = own.contains(property) ? own.at(property) : "nothing";
        if (theirs.is_null() || text.empty() || (column == kSize && text == "0") ||
            isNoMaker(property, text)) {
            continue;
        }
        if (mayBeCutOff(row, property)) {
            EXPECT_THAT(fact, testing::HasSubstr(text)) << row.at("kname") << property;
        } else {
            EXPECT_EQ(fact, text) << row.at("kname") << property;
        }
    }
}

TEST_P(RecordedBesideTools, BlockDevicesAreThoseOfLsblk) {
    addWhatToolsRead();
    const Json all = printedJson("lsblk --json --bytes --output-all --list --sysroot " + recorded_.root());
    if (!has("/sys/block")) {
        return;
    }
    if (!all.is_object()) {
        GTEST_SKIP() << "no lsblk";
    }
    std::map<std::string, Json> rows;
    for (const Json& row : all.at("blockdevices")) {
        rows[row.at("kname")] = row;
    }
    for (const auto& [type, columns] : {std::pair{Class::drive, kOfDrives},
                                        {Class::partition, kOfPartitions},
                                        {Class::fileSystem, kOfFileSystems}}) {
        for (const std::string& name : names(type)) {
            if (rows.contains(name)) {
                expectColumns(factsOf(host(), type, name), rows[name], columns);
            }
        }
    }
}

INSTANTIATE_TEST_SUITE_P(All, RecordedBesideTools, testing::ValuesIn(namesOfRecordedHosts()), nameOfTest);

}  // namespace
