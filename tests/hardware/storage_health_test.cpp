// What drives say of their health: recorded answers, and which questions may be asked.
#include <gmock/gmock.h>

#include "plugins/hardware/storage/health.h"
#include "tests/hardware/storage_host.h"
#include "tests/support/waiting.h"

namespace {

using hardware::Class;
using hardware::Health;
using hardware::ScsiAnswer;
using hardware_test::factsOf;
using hardware_test::FakeDevices;
using hardware_test::StorageHost;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

std::string bytes(std::size_t size, const std::map<std::size_t, std::string>& pieces) {
    std::string all(size, '\0');
    for (const auto& [place, piece] : pieces) {
        all.replace(place, piece.size(), piece);
    }
    return all;
}

std::string raw(std::initializer_list<int> values) {
    std::string all;
    for (const int value : values) {
        all += static_cast<char>(value);
    }
    return all;
}

TEST(NvmeHealth, IsReadFromTheLogPage) {
    // 311 K, spare 98 %, threshold 10 %, 3 % used; 0x01e240 hours.
    const Health health = hardware::nvmeHealth(bytes(
        512, {{0, raw({0, 0x37, 0x01, 98, 10, 3})}, {128, raw({0x40, 0xe2, 0x01})}, {160, raw({2, 1})}}));
    EXPECT_EQ(health.temperature, 38);
    EXPECT_EQ(health.spare, 98U);
    EXPECT_EQ(health.worn, 3U);
    EXPECT_EQ(health.hours, 123456U);
    EXPECT_EQ(health.mediaErrors, 258U);
    EXPECT_THAT(health.warnings, IsEmpty());
}

TEST(NvmeHealth, NamesEachWarningThatIsSet) {
    EXPECT_THAT(hardware::nvmeHealth(bytes(512, {{0, raw({0x0d})}})).warnings,
                ElementsAre("spare blocks run out", "reliability is degraded", "can only be read"));
    EXPECT_THAT(hardware::nvmeHealth(bytes(512, {{0, raw({0x32})}})).warnings,
                ElementsAre("temperature out of its limits", "backup of volatile memory has failed",
                            "persistent memory can only be read"));
}

TEST(NvmeHealth, SaysNothingItWasNotTold) {
    EXPECT_EQ(hardware::nvmeHealth("").spare, std::nullopt);
    EXPECT_EQ(hardware::nvmeHealth(std::string(511, '\x01')).worn, std::nullopt);
    EXPECT_EQ(hardware::nvmeHealth(std::string(512, '\0')).temperature, std::nullopt);
    EXPECT_EQ(hardware::nvmeHealth(std::string(512, '\xff')).hours, std::nullopt) << "more than 64 bits hold";
    EXPECT_EQ(hardware::nvmeHealth(std::string(512, '\xff')).temperature, 65535 - 273);
}

// The registers of an ATA drive in sense data: count, middle and high.
std::string descriptors(int count, int middle = 0, int high = 0) {
    return bytes(22, {{0, raw({0x72, 0x01, 0, 0x1d, 0, 0, 0, 14})},
                      {8, raw({0x09, 0x0c, 0, 0, 0, count, 0, 0, 0, middle, 0, high, 0xa0, 0x50})}});
}

std::string sound(std::string block) {
    unsigned int sum = 0;
    for (const char byte : block) {
        sum += static_cast<unsigned char>(byte);
    }
    block.back() = static_cast<char>(block.back() - static_cast<char>(sum & 0xffU));
    return block;
}

/// A solid-state drive with SMART, logs and 12 % of its life behind it.
struct AtaDrive {
    std::string power = descriptors(0xff);
    std::string status = descriptors(0, 0x4f, 0xc2);
    std::string identity =
        bytes(512, {{82 * 2, raw({1})}, {84 * 2, raw({0x20})}, {85 * 2, raw({1})}, {217 * 2, raw({1})}});
    std::string data = sound(bytes(512, {{2, raw({9, 0x32, 0, 95, 95, 0x39, 0x30, 0, 0x77})},
                                         {14, raw({194, 0x22, 0, 60, 40, 40, 0, 20, 0, 55})}}));
    std::string logs = bytes(512, {{8, raw({8})}});
    std::string statistics = bytes(512, {{0, raw({1, 0, 7})}, {8, raw({12, 0, 0, 0, 0, 0, 0, 0xc0})}});

    std::optional<ScsiAnswer> operator()(const FakeDevices::Command& command) const {
        const std::string head = command.at(0) == 0x85 ? "" : "not an ATA command";
        switch (command.at(14)) {
            case 0xe5:
                return ScsiAnswer{head, power};
            case 0xec:
                return ScsiAnswer{identity, ""};
            case 0xb0:
                return command.at(4) == 0xd0 ? ScsiAnswer{data, ""} : ScsiAnswer{"", status};
            case 0x2f:
                return ScsiAnswer{command.at(8) == 4 && command.at(10) == 7 ? statistics : logs, ""};
            default:
                return std::nullopt;
        }
    }
};

Health healthOf(const AtaDrive& drive) {
    FakeDevices devices;
    devices.drive = drive;
    return hardware::askAta(devices, {"/dev/sda", "8:0", ""});
}

TEST(AtaHealth, IsPutTogetherFromSmartAndStatistics) {
    const Health health = healthOf({});
    EXPECT_EQ(health.power, "active");
    EXPECT_EQ(health.hours, 12345U) << "what a maker counts in the upper bytes is something else";
    EXPECT_EQ(health.temperature, 40);
    EXPECT_EQ(health.worn, 12U);
    EXPECT_THAT(health.warnings, IsEmpty());
}

TEST(AtaHealth, AsksWithTheCommandsOfTheStandard) {
    FakeDevices devices;
    devices.drive = AtaDrive();
    hardware::askAta(devices, {"/dev/sda", "8:0", ""});
    EXPECT_THAT(devices.asked(), ElementsAre("8506200000000000000000000000e500: /dev/sda 8:0",
                                             "85080e0000000100000000000000ec00: /dev/sda 8:0",
                                             "85080e00d000010000004f00c200b000: /dev/sda 8:0",
                                             "85062000da00000000004f00c200b000: /dev/sda 8:0",
                                             "85090e00000001000000000000002f00: /dev/sda 8:0",
                                             "85090e00000001000400070000002f00: /dev/sda 8:0"));
}

TEST(AtaHealth, ADriveThatSleepsIsAskedNothingElse) {
    for (const int state : {0x00, 0x01, 0x40}) {
        FakeDevices devices;
        AtaDrive drive;
        drive.power = descriptors(state);
        devices.drive = drive;
        EXPECT_EQ(hardware::askAta(devices, {"/dev/sda", "8:0", ""}).power, "standby");
        EXPECT_EQ(devices.asked().size(), 1U) << state;
    }
}

TEST(AtaHealth, ADriveThatDoesNotTellItsStateIsAskedNothingElse) {
    const std::string fixed = bytes(18, {{0, raw({0x70, 0, 1})}, {6, raw({0xff})}, {12, raw({0, 0x1c})}});
    for (const std::string& sense : {std::string(), std::string("\x72"), descriptors(0x55), fixed,
                                     descriptors(0xff).substr(0, 15), std::string(64, '\xff')}) {
        FakeDevices devices;
        AtaDrive drive;
        drive.power = sense;
        devices.drive = drive;
        EXPECT_EQ(hardware::askAta(devices, {"/dev/sda", "8:0", ""}).power, std::nullopt);
        EXPECT_EQ(devices.asked().size(), 1U);
    }
}

TEST(AtaHealth, BothFormatsOfSenseDataTellTheRegisters) {
    AtaDrive drive;
    drive.power = bytes(18, {{0, raw({0x70, 0, 1})}, {3, raw({0, 0x50, 0, 0x80})}, {12, raw({0, 0x1d})}});
    drive.status = bytes(18, {{0, raw({0x70, 0, 1})}, {10, raw({0xf4, 0x2c, 0, 0x1d})}});
    EXPECT_EQ(healthOf(drive).power, "idle");
    EXPECT_THAT(healthOf(drive).warnings, ElementsAre("failure predicted"));
}

TEST(AtaHealth, AFailureThatTheDrivePredictsIsAWarning) {
    AtaDrive drive;
    drive.status = descriptors(0, 0xf4, 0x2c);
    EXPECT_THAT(healthOf(drive).warnings, ElementsAre("failure predicted"));
}

TEST(AtaHealth, WithoutSmartOrLogsThereIsLess) {
    AtaDrive drive;
    drive.identity[85 * 2] = 0;  // switched off
    EXPECT_EQ(healthOf(drive).hours, std::nullopt);
    EXPECT_EQ(healthOf(drive).worn, 12U);
    drive.identity[84 * 2] = 0;
    EXPECT_EQ(healthOf(drive).worn, std::nullopt);
}

TEST(AtaHealth, BlocksThatCannotBeTrustedTellNothing) {
    AtaDrive drive;
    drive.data[100] = 1;  // the sum is wrong
    drive.statistics[15] = 0x40;
    EXPECT_EQ(healthOf(drive).temperature, std::nullopt);
    EXPECT_EQ(healthOf(drive).worn, std::nullopt);
    drive.data = std::string(512, '\0');
    EXPECT_EQ(healthOf(drive).hours, std::nullopt);
    drive.data = "short";
    EXPECT_EQ(healthOf(drive).hours, std::nullopt);
}

TEST(AtaHealth, AColdDriveIsBelowZero) {
    AtaDrive drive;
    drive.data = sound(bytes(512, {{2, raw({190, 0x22, 0, 60, 40, 0xfb})}}));
    EXPECT_EQ(healthOf(drive).temperature, -5);
}

/// A SAS drive with all log pages that are asked for.
struct ScsiDrive {
    std::string sense = bytes(18, {{0, raw({0x70})}});
    std::map<int, std::string> pages = {
        {0x00, raw({0, 0, 0, 5, 0x00, 0x0d, 0x11, 0x15, 0x2f})},
        {0x0d, raw({0x0d, 0, 0, 12, 0, 0, 1, 2, 0, 36, 0, 1, 1, 2, 0, 68})},
        {0x11, raw({0x11, 0, 0, 8, 0, 1, 3, 4, 0, 0, 0, 7})},
        {0x15, raw({0x15, 0, 0, 8, 0, 0, 2, 4, 0, 1, 0x51, 0x80})},  // 86,400 minutes
        {0x2f, raw({0x2f, 0, 0, 7, 0, 0, 3, 3, 0, 0, 35})},
    };

    std::optional<ScsiAnswer> operator()(const FakeDevices::Command& command) const {
        if (command.at(0) == 0x03) {
            return ScsiAnswer{sense, ""};
        }
        const auto page = pages.find(command.at(2) & 0x3f);
        return page == pages.end() ? ScsiAnswer{"", "\x70"} : ScsiAnswer{page->second, ""};
    }
};

Health healthOf(const ScsiDrive& drive) {
    FakeDevices devices;
    devices.drive = drive;
    return hardware::askScsi(devices, {"/dev/sda", "8:0", ""});
}

TEST(ScsiHealth, IsPutTogetherFromTheLogPages) {
    const Health health = healthOf(ScsiDrive());
    EXPECT_EQ(health.power, "active");
    EXPECT_EQ(health.temperature, 36);
    EXPECT_EQ(health.worn, 7U);
    EXPECT_EQ(health.hours, 1440U);
    EXPECT_THAT(health.warnings, IsEmpty());
}

TEST(ScsiHealth, OnlyPagesThatTheDriveHasAreAskedFor) {
    FakeDevices devices;
    ScsiDrive drive;
    drive.pages[0] = raw({0, 0, 0, 2, 0x00, 0x2f});
    drive.pages[0x2f] = raw({0x2f, 0, 0, 7, 0, 0, 3, 3, 0x5d, 0x10, 51});
    devices.drive = drive;
    const Health health = hardware::askScsi(devices, {"/dev/sda", "8:0", ""});
    EXPECT_THAT(devices.asked(),
                ElementsAre("03000000fc00: /dev/sda 8:0", "4d00400000000000fc00: /dev/sda 8:0",
                            "4d006f0000000000fc00: /dev/sda 8:0"));
    EXPECT_THAT(health.warnings, ElementsAre("failure predicted"));
    EXPECT_EQ(health.temperature, 51);
}

TEST(ScsiHealth, ADriveThatSleepsOrIsStoppedIsAskedNothingElse) {
    const std::map<std::string, std::string> senses = {
        {bytes(18, {{0, raw({0x70})}, {12, raw({0x5e, 0x43})}}), "standby"},
        {bytes(18, {{0, raw({0x70, 0, 2})}, {12, raw({0x04, 0x02})}}), "not ready"}};
    for (const auto& [sense, state] : senses) {
        FakeDevices devices;
        ScsiDrive drive;
        drive.sense = sense;
        devices.drive = drive;
        EXPECT_EQ(hardware::askScsi(devices, {"/dev/sda", "8:0", ""}).power, state);
        EXPECT_EQ(devices.asked().size(), 1U);
    }
}

TEST(ScsiHealth, PagesOfAnyShapeDoNoHarm) {
    ScsiDrive drive;
    drive.pages[0x0d] = raw({0x0d, 0, 0xff, 0xff, 0, 0, 1, 0xff});     // longer than it is
    drive.pages[0x11] = raw({0x0d, 0, 0, 8, 0, 1, 3, 4, 0, 0, 0, 7});  // another page
    drive.pages[0x15] = raw({0x15, 0, 0, 3, 0, 0});
    drive.pages[0x2f] = raw({0x2f, 0, 0, 8, 0, 9, 0, 0, 0, 9, 0, 0});  // parameters without content
    const Health health = healthOf(drive);
    EXPECT_EQ(health.temperature, std::nullopt);
    EXPECT_EQ(health.worn, std::nullopt);
    EXPECT_EQ(health.hours, std::nullopt);
}

TEST(DriveHealth, AnAtaDriveIsAskedByItsOwnFile) {
    StorageHost host;
    host.block("sda", "pci0/ata1/host0/target0:0:0/0:0:0:0", "8:0");
    host.file("/sys/devices/pci0/ata1/host0/target0:0:0/0:0:0:0/vendor", "ATA");
    host.devices->drive = AtaDrive();
    const auto facts = factsOf(host.asRoot(), Class::drive, "sda");
    EXPECT_EQ(facts.at("PowerState"), "active");
    EXPECT_EQ(facts.at("Temperature"), "40");
    EXPECT_EQ(facts.at("Worn"), "12");
    EXPECT_EQ(facts.at("PowerOnHours"), "12345");
    EXPECT_THAT(host.devices->asked().front(), HasSubstr("e500: /dev/sda 8:0"));
}

TEST(DriveHealth, AnNvmeDriveIsAskedByItsController) {
    StorageHost host;
    host.block("nvme0n1", "pci0/nvme/nvme0", "259:0");
    host.file("/sys/devices/pci0/nvme/nvme0/state", "live");
    host.file("/sys/devices/pci0/nvme/nvme0/dev", "241:7");
    host.devices->nvme = [](const auto&) { return bytes(512, {{0, raw({4, 0x2d, 1, 90, 10, 101})}}); };
    const auto facts = factsOf(host.asRoot(), Class::drive, "nvme0n1");
    EXPECT_EQ(facts.at("Temperature"), "28");
    EXPECT_EQ(facts.at("Worn"), "101");
    EXPECT_EQ(facts.at("Spare"), "90");
    EXPECT_EQ(facts.at("Warnings"), "reliability is degraded");
    EXPECT_THAT(host.devices->asked(), ElementsAre("nvme log 2 of 512 bytes: /dev/nvme0 241:7 character"));
}

TEST(DriveHealth, WhatMustNotBeAskedIsNot) {
    const std::map<std::string, std::pair<std::string, std::string>> reasons = {
        {"power/runtime_status", {"pci0/ata1/host0/target0:0:0/0:0:0:0", "suspended"}},
        {"state", {"pci0/ata1/host0/target0:0:0/0:0:0:0", "offline"}},
        {"type", {"pci0/ata1/host0/target0:0:0/0:0:0:0", "5"}},
        {"model", {"pci0/usb1/1-1/host0/target0:0:0/0:0:0:0", "a drive in a case"}},
        {"rev", {"pci0/virtio1/host0/target0:0:0/0:0:0:0", "a drive of a virtual machine"}},
        {"wwid", {"platform/host0/session1/target0:0:0/0:0:0:0", "a drive behind a network"}},
    };
    for (const auto& [file, reason] : reasons) {
        StorageHost host;
        host.block("sda", reason.first, "8:0");
        host.file("/sys/devices/" + reason.first + "/" + file, reason.second);
        host.devices->drive = AtaDrive();
        factsOf(host.asRoot(), Class::drive, "sda");
        EXPECT_THAT(host.devices->asked(), IsEmpty()) << file;
    }
}

TEST(DriveHealth, ADriveThatTheKernelLetsSleepIsOnStandby) {
    StorageHost host;
    host.block("sda", "pci0/ata1/host0/target0:0:0/0:0:0:0", "8:0");
    host.file("/sys/class/block/sda/device/power/runtime_status", "suspended");
    for (const hardware::Host& seen : {host.asRoot(), host.asNobody(), host.host()}) {
        EXPECT_EQ(factsOf(seen, Class::drive, "sda")["PowerState"], "standby");
    }
}

TEST(DriveHealth, AControllerThatSleepsOrIsResetIsNotAsked) {
    const std::map<std::string, std::string> reasons = {{"state", "resetting"},
                                                        {"device/power/runtime_status", "suspended"}};
    for (const auto& [file, reason] : reasons) {
        StorageHost host;
        host.block("nvme0n1", "pci0/nvme/nvme0", "259:0");
        host.file("/sys/devices/pci0/nvme/nvme0/state", "live");
        host.file("/sys/devices/pci0/nvme/nvme0/dev", "241:0");
        host.file("/sys/devices/pci0/nvme/nvme0/" + file, reason);
        factsOf(host.asRoot(), Class::drive, "nvme0n1");
        EXPECT_THAT(host.devices->asked(), IsEmpty()) << file;
    }
}

TEST(DriveHealth, OfSeveralControllersThatLeadToADriveTheFirstThatWorksIsAsked) {
    StorageHost host;
    host.block("nvme0n1", "virtual/nvme-subsystem/nvme-subsys0", "259:0");
    for (const auto& [name, state] :
         std::map<std::string, std::string>{{"nvme2", "connecting"}, {"nvme10", "live"}}) {
        host.file("/sys/devices/ctl/" + name + "/state", state);
        host.file("/sys/devices/ctl/" + name + "/dev", "241:" + name.substr(4));
        host.link("/sys/devices/virtual/nvme-subsystem/nvme-subsys0/" + name, "../../../ctl/" + name);
    }
    factsOf(host.asRoot(), Class::drive, "nvme0n1");
    EXPECT_THAT(host.devices->asked(), ElementsAre("nvme log 2 of 512 bytes: /dev/nvme10 241:10 character"));
}

TEST(DriveHealth, OthersThanRootGetNone) {
    StorageHost host;
    host.block("sda", "pci0/ata1/host0/target0:0:0/0:0:0:0", "8:0");
    host.devices->drive = ScsiDrive();
    EXPECT_FALSE(factsOf(host.asNobody(), Class::drive, "sda").contains("Temperature"));
    EXPECT_THAT(host.devices->asked(), IsEmpty());
}

TEST(DriveHealth, ADriveThatHangsCostsOnlyItsHealthAndIsAskedOnce) {
    using std::chrono::milliseconds;
    StorageHost host;
    const auto gate = std::make_shared<hardware_test::Gate>();
    host.block("sda", "pci0/ata1/host0/target0:0:0/0:0:0:0", "8:0");
    host.devices->drive = [gate](const auto& command) {
        gate->wait();
        return ScsiDrive()(command);
    };
    const hardware::Host patient = host.asRoot(milliseconds(30), std::chrono::hours(1));
    for (int look = 0; look < 3; ++look) {
        const auto facts = factsOf(patient, Class::drive, "sda");
        EXPECT_EQ(facts.at("Size"), "1048576");
        EXPECT_FALSE(facts.contains("PowerState"));
    }
    ASSERT_TRUE(eventually([&host] { return !host.devices->asked().empty(); }));
    EXPECT_EQ(host.devices->asked().size(), 1U);
    gate->open();
}

TEST(DriveHealth, IsKeptForAWhile) {
    StorageHost host;
    host.block("sda", "pci0/ata1/host0/target0:0:0/0:0:0:0", "8:0");
    host.devices->drive = ScsiDrive();
    const hardware::Host kept = host.asRoot(std::chrono::seconds(20), std::chrono::hours(1));
    EXPECT_EQ(factsOf(kept, Class::drive, "sda").at("Temperature"), "36");
    const std::size_t before = host.devices->asked().size();
    EXPECT_EQ(factsOf(kept, Class::drive, "sda").at("Temperature"), "36");
    EXPECT_EQ(host.devices->asked().size(), before);
    host.file("/sys/class/block/sda/diskseq", "2");  // another drive has come by this name
    factsOf(kept, Class::drive, "sda");
    EXPECT_GT(host.devices->asked().size(), before);
}

}  // namespace
