// Drives that sleep and are not to be woken, and what is told of those that do not answer.
#include <gmock/gmock.h>
#include <unistd.h>

#include <filesystem>
#include <future>
#include <stdexcept>

#include "plugins/hardware/storage/storage.h"
#include "tests/hardware/storage_host.h"
#include "tests/support/waiting.h"

namespace {

using hardware::Class;
using hardware::ScsiAnswer;
using hardware_test::factsOf;
using hardware_test::StorageHost;
using testing::ElementsAre;
using testing::IsEmpty;

constexpr const char* kController = "/sys/devices/pci0/nvme/nvme0";

/// A host with one NVMe drive of 27 degrees, which answers when the gate is open.
class WaitedFor : public testing::Test {
protected:
    WaitedFor() {
        host_.block("nvme0n1", "pci0/nvme/nvme0", "259:0");
        host_.file(std::string(kController) + "/state", "live");
        host_.file(std::string(kController) + "/dev", "241:0");
        host_.devices->nvme = [gate = gate_](const auto&) {
            gate->wait();
            std::string page(512, '\0');
            page.replace(1, 2, "\x2c\x01");
            return page;
        };
    }
    ~WaitedFor() override { gate_->open(); }

    StorageHost host_;
    const std::shared_ptr<hardware_test::Gate> gate_ = std::make_shared<hardware_test::Gate>();
};

TEST_F(WaitedFor, ADriveThatHangsLeavesItsHealthUnansweredAndNothingElse) {
    hardware::Found found{Class::drive, "nvme0n1"};
    hardware::describeDrive(host_.asRoot(std::chrono::milliseconds(30)), found);
    std::vector<std::string> unanswered;
    for (const hardware::Row& row : hardware::driveRows()) {
        if (found.facts.isUnanswered(row.id)) {
            unanswered.emplace_back(row.name);
        }
    }
    EXPECT_THAT(unanswered, ElementsAre("PowerState", "Temperature", "Worn", "Spare", "PowerOnHours",
                                        "Warnings", "MediaErrors"));
}

TEST_F(WaitedFor, WhoComesWhileTheFirstAnswerIsAwaitedGetsIt) {
    const hardware::Host kept = host_.asRoot(std::chrono::seconds(20), std::chrono::hours(1));
    const auto ask = [&kept] { return factsOf(kept, Class::drive, "nvme0n1")["Temperature"]; };
    std::future<std::string> first = std::async(std::launch::async, ask);
    ASSERT_TRUE(eventually([this] { return !host_.devices->asked().empty(); }));
    std::future<std::string> second = std::async(std::launch::async, ask);
    EXPECT_EQ(second.wait_for(std::chrono::milliseconds(20)), std::future_status::timeout);
    gate_->open();
    EXPECT_EQ(first.get(), "27");
    EXPECT_EQ(second.get(), "27");
    EXPECT_EQ(host_.devices->asked().size(), 1U);
}

TEST_F(WaitedFor, AFileSystemThatHangsLeavesItsRoomUnanswered) {
    host_.file("/proc/1/mountinfo", "22 1 259:0 / / rw - xfs /dev/nvme0n1 rw");
    host_.file("/proc/self/mountinfo", "22 1 259:0 / / rw - xfs /dev/nvme0n1 rw");
    host_.devices->space = [gate = gate_](const auto&) {
        gate->wait();
        return hardware::Room{};
    };
    hardware::Found found{Class::fileSystem, "nvme0n1"};
    hardware::describeFileSystem(host_.asRoot(std::chrono::milliseconds(30)), found);
    EXPECT_EQ(factsOf(host_.host(), Class::fileSystem, "nvme0n1").at("FileSystemType"), "xfs");
    EXPECT_TRUE(found.facts.isUnanswered(30705));
    EXPECT_TRUE(found.facts.isUnanswered(30706));
    EXPECT_FALSE(found.facts.isUnanswered(30704));
}

TEST_F(WaitedFor, AFileSystemOfADriveThatHangsIsNotGone) {
    host_.file("/sys/class/block/nvme0n1/queue/rotational", "0");
    bool hangs = false;
    host_.devices->inside = [&hangs, gate = gate_](const auto&) {
        if (hangs) {
            gate->wait();
        }
        return hardware::DeviceAccess::Contents{{"TYPE", "xfs"}, {"USAGE", "filesystem"}};
    };
    const hardware::Host patient = host_.asRoot(std::chrono::milliseconds(500));
    EXPECT_THAT(hardware::listFileSystems(patient), ElementsAre("nvme0n1"));
    hangs = true;
    EXPECT_THAT(hardware::listFileSystems(patient), ElementsAre("nvme0n1"));
    host_.file("/sys/class/block/nvme0n1/diskseq", "2");  // another drive, of which nothing is known
    EXPECT_THAT(hardware::listFileSystems(patient), IsEmpty());
    gate_->open();
}

using Told = hardware::DeviceAccess::Told;

/// The open descriptors, but for the one that reads the list.
std::string openDescriptors() {
    std::string all;
    for (const auto& entry : std::filesystem::directory_iterator("/proc/self/fd")) {
        const std::filesystem::path target = std::filesystem::read_symlink(entry.path());
        all += target.string().starts_with("/proc/") ? "" : target.string().substr(0, 5);
    }
    return all;
}

TEST(OtherProcess, TextsComeBackAsTheyWereTold) {
    const Told told{{"a", "1"}, {"b", ""}, {"c d", "e=f "}, {"long", std::string(3000, 'x')}};
    EXPECT_EQ(hardware::ownDevices()->inOtherProcess([&told] { return told; }), told);
    EXPECT_THAT(hardware::ownDevices()->inOtherProcess([] { return Told(); }), IsEmpty());
    EXPECT_THAT(
        hardware::ownDevices()->inOtherProcess([]() -> Told { throw std::runtime_error("no memory"); }),
        IsEmpty());
    EXPECT_THAT(hardware::ownDevices()->inOtherProcess([]() -> Told { _exit(0); }), IsEmpty());
}

TEST(OtherProcess, TheProcessIsNotOursAndKeepsNothingOpen) {
    Told told = hardware::ownDevices()->inOtherProcess([] {
        return Told{{"parent", std::to_string(getppid())}, {"open", openDescriptors()}};
    });
    EXPECT_NE(told["parent"], std::to_string(getpid()));
    EXPECT_EQ(told["open"], "pipe:");
}

TEST(OtherProcess, HealthIsToldWhole) {
    hardware::Health health;
    health.power = "idle";
    health.temperature = -3;
    health.worn = 0;
    health.spare = 100;
    health.hours = 18446744073709551615ULL;
    health.mediaErrors = 3;
    health.warnings = {"one", "two"};
    const hardware::Health same = hardware::healthFrom(hardware::toldOf(health));
    EXPECT_EQ(same.power, "idle");
    EXPECT_EQ(same.temperature, -3);
    EXPECT_EQ(same.worn, 0U);
    EXPECT_EQ(same.spare, 100U);
    EXPECT_EQ(same.hours, 18446744073709551615ULL);
    EXPECT_EQ(same.mediaErrors, 3U);
    EXPECT_THAT(same.warnings, ElementsAre("one", "two"));
    EXPECT_THAT(hardware::toldOf(hardware::healthFrom({})), IsEmpty());
}

/// A drive whose driver shows its temperature as a sensor.
class DriveSensor : public testing::Test {
protected:
    DriveSensor() {
        const std::string bus = "pci0/ata1/host0/target0:0:0/0:0:0:0";
        const std::string device = "/sys/devices/" + bus;
        host_.block("sda", bus, "8:0");
        host_.file(device + "/vendor", "ATA");
        host_.link(device + "/subsystem", "/sys/bus/scsi");
        host_.file(device + "/hwmon/hwmon3/name", "drivetemp");
        host_.file(device + "/hwmon/hwmon3/temp1_input", "31000");
        host_.file(device + "/hwmon/hwmon3/temp1_max", "55000");
        host_.link(device + "/hwmon/hwmon3/device", "../..");
        host_.link("/sys/class/hwmon/hwmon3", "../../.." + device + "/hwmon/hwmon3");
        host_.file("/sys/class/block/sda/queue/rotational", "1");
        powerModeIs('\xff');
    }
    /// What the drive answers to CHECK POWER MODE.
    void powerModeIs(char mode) {
        std::string sense(18, '\0');
        sense[0] = 0x70;
        sense[6] = mode;
        sense[13] = 0x1d;
        host_.devices->drive = [sense](const auto& command) {
            return std::optional(ScsiAnswer{"", command.at(14) == 0xe5 ? sense : ""});
        };
    }
    std::string temperature(const hardware::Host& host) const {
        auto facts = factsOf(host, Class::sensor, "drivetemp-scsi-0-0:temp1");
        EXPECT_EQ(facts["HighLimit"], "55");
        return facts["Temperature"];
    }

    StorageHost host_;
};

TEST_F(DriveSensor, OfADriveThatTurnsIsRead) {
    EXPECT_EQ(temperature(host_.asRoot()), "31");
    EXPECT_EQ(temperature(host_.host()), "31") << "a recorded host";
}

TEST_F(DriveSensor, OfADriveThatSleepsIsNotRead) {
    powerModeIs(0);
    EXPECT_EQ(temperature(host_.asRoot()), "");
    EXPECT_EQ(host_.devices->asked().size(), 1U);
    host_.devices->drive = [](const auto&) { return std::nullopt; };
    EXPECT_EQ(temperature(host_.asRoot()), "") << "nor that of one that does not tell";
}

TEST_F(DriveSensor, OfADriveThatTheKernelLetsSleepIsNotReadNorIsTheDriveAsked) {
    host_.file("/sys/class/block/sda/device/power/runtime_status", "suspended");
    for (const char* turns : {"1", "0"}) {
        host_.file("/sys/class/block/sda/queue/rotational", turns);
        EXPECT_EQ(temperature(host_.asRoot()), "") << turns;
    }
    EXPECT_THAT(host_.devices->asked(), IsEmpty());
}

TEST_F(DriveSensor, WhoMayNotAskATurningDriveDoesNotReadIt) {
    EXPECT_EQ(temperature(host_.asNobody()), "");
    host_.file("/sys/class/block/sda/queue/rotational", "0");
    EXPECT_EQ(temperature(host_.asNobody()), "31");
    EXPECT_THAT(host_.devices->asked(), IsEmpty());
}

}  // namespace
