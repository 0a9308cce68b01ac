#include <algorithm>
#include <array>
#include <string_view>

#include "plugins/hardware/storage/block.h"
#include "plugins/hardware/storage/drive_health.h"
#include "plugins/hardware/storage/identity.h"
#include "plugins/hardware/storage/storage.h"

namespace hardware {

namespace {

constexpr auto kType = Class::drive;

enum : Id {
    kTransport = firstId(kType) + 1,
    kMaker,
    kModel,
    kSerial,
    kFirmware,
    kWwn,
    kSize,
    kLogicalBlock,
    kPhysicalBlock,
    kRotational,
    kRemovable,
    kReadOnly,
    kReads,
    kReadBytes,
    kWrites,
    kWrittenBytes,
    kErrors,
    kPower,
    kTemperature,
    kWorn,
    kSpare,
    kHours,
    kWarnings,
    kMediaErrors,
};

constexpr const char* kHealth =
    "NVMe log page 2, ATA SMART and device statistics, SCSI log pages, device/life_time";

constexpr Row kRows[] = {
    {kTransport, "Transport", Kind::text, "", "where /sys/class/block/DRIVE/device leads",
     "how the drive is attached: nvme, sata, sas, usb, virtio and others"},
    {kMaker, "Maker", Kind::text, "", "device/vendor", "who made it"},
    {kModel, "Model", Kind::text, "", "device/vpd_pg89, ID_MODEL_ENC of udev, device/model or device/name",
     "the model"},
    {kSerial, "SerialNumber", Kind::text, "",
     "device/serial, serial, device/vpd_pg80, ID_SERIAL_SHORT of udev", "the serial number", kTrusted},
    {kFirmware, "FirmwareVersion", Kind::text, "",
     "device/firmware_rev, device/vpd_pg89, ID_REVISION of udev, device/rev, device/fwrev",
     "version of its firmware"},
    {kWwn, "WWN", Kind::text, "", "wwid, device/wwid or ID_WWN of udev", "the world-wide name", kTrusted},
    {kSize, "Size", Kind::number, "bytes", "size", "how much it holds; not told without a medium"},
    {kLogicalBlock, "LogicalBlockSize", Kind::number, "bytes", "queue/logical_block_size",
     "smallest piece that can be addressed"},
    {kPhysicalBlock, "PhysicalBlockSize", Kind::number, "bytes", "queue/physical_block_size",
     "smallest piece that is written at once"},
    {kRotational, "Rotational", Kind::flag, "", "queue/rotational", "whether it has turning disks"},
    {kRemovable, "Removable", Kind::flag, "", "removable", "whether the medium can be taken out"},
    {kReadOnly, "ReadOnly", Kind::flag, "", "ro", "whether it cannot be written"},
    {kReads, "Reads", Kind::number, "", "stat", "reads completed", kLive},
    {kReadBytes, "ReadBytes", Kind::number, "bytes", "stat", "bytes read", kLive},
    {kWrites, "Writes", Kind::number, "", "stat", "writes completed", kLive},
    {kWrittenBytes, "WrittenBytes", Kind::number, "bytes", "stat", "bytes written", kLive},
    {kErrors, "Errors", Kind::number, "", "device/ioerr_cnt", "commands that failed", kLive},
    {kPower, "PowerState", Kind::text, "",
     "device/power/runtime_status, ATA CHECK POWER MODE, SCSI REQUEST SENSE",
     "active, idle, standby or not ready; what sleeps is asked nothing", kLive},
    {kTemperature, "Temperature", Kind::number, "degrees Celsius", kHealth, "how warm it is inside", kLive},
    {kWorn, "Worn", Kind::number, "percent", kHealth,
     "part of its life that is used up, as its maker counts it", kLive},
    {kSpare, "Spare", Kind::number, "percent", "NVMe log page 2", "spare blocks that are left", kLive},
    {kHours, "PowerOnHours", Kind::number, "hours", kHealth, "how long it has been running", kLive},
    {kWarnings, "Warnings", Kind::texts, "", kHealth, "what is wrong with it, as it says itself", kLive},
    {kMediaErrors, "MediaErrors", Kind::number, "", "NVMe log page 2",
     "pieces of data that it could not read or keep whole", kLive},
};

}  // namespace

Rows driveRows() {
    return kRows;
}

std::vector<std::string> listDrives(const Host& host) {
    return block::ofClass(host, kType);
}

void describeDrive(const Host& host, Found& found) {
    const std::string directory = block::directory(found.name);
    Facts& facts = found.facts;
    const std::optional<std::string> transport = transportOf(host, found.name);
    const DriveIdentity identity = identify(host, found.name);
    facts.text(kTransport, transport);
    facts.text(kMaker, identity.maker);
    facts.text(kModel, identity.model);
    if (host.privileged()) {
        facts.text(kSerial, identity.serial);
        facts.text(kWwn, identity.wwn);
    }
    facts.text(kFirmware, identity.firmware);
    facts.number(kSize, block::sizeOf(host, found.name));
    facts.number(kLogicalBlock, host.number(directory + "/queue/logical_block_size"));
    facts.number(kPhysicalBlock, host.number(directory + "/queue/physical_block_size"));
    facts.flag(kRotational, host.flag(directory + "/queue/rotational"));
    facts.flag(kRemovable, host.flag(directory + "/removable"));
    facts.flag(kReadOnly, host.flag(directory + "/ro"));
    block::count(host, found.name, {kReads, kReadBytes, kWrites, kWrittenBytes}, facts);
    facts.number(kErrors, host.number(directory + "/device/ioerr_cnt"));
    addHealth(host, found.name, transport.value_or(""),
              {kPower, kTemperature, kWorn, kSpare, kHours, kWarnings, kMediaErrors}, facts);
}

}  // namespace hardware
