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

constexpr Row row(Id id, const char* name, Kind kind, const char* unit, const char* source,
                  const char* meaning, bool live = false) {
    return {kType, id, name, kind, unit, source, meaning, Audience::everybody, live};
}

constexpr const char* kHealth =
    "NVMe log page 2, ATA SMART and device statistics, SCSI log pages, device/life_time";

constexpr Row kRows[] = {
    row(kTransport, "Transport", Kind::text, "", "where /sys/class/block/DRIVE/device leads",
        "how the drive is attached: nvme, sata, sas, usb, virtio and others"),
    row(kMaker, "Maker", Kind::text, "", "device/vendor", "who made it"),
    row(kModel, "Model", Kind::text, "", "device/vpd_pg89, ID_MODEL_ENC of udev, device/model or device/name",
        "the model"),
    {kType, kSerial, "SerialNumber", Kind::text, "",
     "device/serial, serial, device/vpd_pg80, ID_SERIAL_SHORT of udev", "the serial number",
     Audience::trusted},
    row(kFirmware, "FirmwareVersion", Kind::text, "",
        "device/firmware_rev, device/vpd_pg89, ID_REVISION of udev, device/rev, device/fwrev",
        "version of its firmware"),
    {kType, kWwn, "WWN", Kind::text, "", "wwid, device/wwid or ID_WWN of udev", "the world-wide name",
     Audience::trusted},
    row(kSize, "Size", Kind::number, "bytes", "size", "how much it holds; not told without a medium"),
    row(kLogicalBlock, "LogicalBlockSize", Kind::number, "bytes", "queue/logical_block_size",
        "smallest piece that can be addressed"),
    row(kPhysicalBlock, "PhysicalBlockSize", Kind::number, "bytes", "queue/physical_block_size",
        "smallest piece that is written at once"),
    row(kRotational, "Rotational", Kind::flag, "", "queue/rotational", "whether it has turning disks"),
    row(kRemovable, "Removable", Kind::flag, "", "removable", "whether the medium can be taken out"),
    row(kReadOnly, "ReadOnly", Kind::flag, "", "ro", "whether it cannot be written"),
    row(kReads, "Reads", Kind::number, "", "stat", "reads completed", true),
    row(kReadBytes, "ReadBytes", Kind::number, "bytes", "stat", "bytes read", true),
    row(kWrites, "Writes", Kind::number, "", "stat", "writes completed", true),
    row(kWrittenBytes, "WrittenBytes", Kind::number, "bytes", "stat", "bytes written", true),
    row(kErrors, "Errors", Kind::number, "", "device/ioerr_cnt", "commands that failed", true),
    row(kPower, "PowerState", Kind::text, "",
        "device/power/runtime_status, ATA CHECK POWER MODE, SCSI REQUEST SENSE",
        "active, idle, standby or not ready; what sleeps is asked nothing", true),
    row(kTemperature, "Temperature", Kind::number, "degrees Celsius", kHealth, "how warm it is inside", true),
    row(kWorn, "Worn", Kind::number, "percent", kHealth,
        "part of its life that is used up, as its maker counts it", true),
    row(kSpare, "Spare", Kind::number, "percent", "NVMe log page 2", "spare blocks that are left", true),
    row(kHours, "PowerOnHours", Kind::number, "hours", kHealth, "how long it has been running", true),
    row(kWarnings, "Warnings", Kind::texts, "", kHealth, "what is wrong with it, as it says itself", true),
    row(kMediaErrors, "MediaErrors", Kind::number, "", "NVMe log page 2",
        "pieces of data that it could not read or keep whole", true),
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
