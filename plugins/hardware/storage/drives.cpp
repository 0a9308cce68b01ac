#include <algorithm>
#include <array>
#include <string_view>

#include "plugins/hardware/storage/block.h"
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
};

constexpr Row row(Id id, const char* name, Kind kind, const char* unit, const char* source,
                  const char* meaning, bool live = false) {
    return {kType, id, name, kind, unit, source, meaning, Audience::everybody, live};
}

constexpr Row kRows[] = {
    row(kTransport, "Transport", Kind::text, "", "where /sys/class/block/DRIVE/device leads",
        "how the drive is attached: nvme, sata, sas, usb, virtio and others"),
    row(kMaker, "Maker", Kind::text, "", "device/vendor", "who made it"),
    row(kModel, "Model", Kind::text, "", "device/model or device/name", "the model"),
    {kType, kSerial, "SerialNumber", Kind::text, "",
     "device/serial, serial, device/vpd_pg80 or ID_SERIAL_SHORT of udev", "the serial number",
     Audience::trusted},
    row(kFirmware, "FirmwareVersion", Kind::text, "", "device/firmware_rev, device/rev or device/fwrev",
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
};

struct Attachment {
    std::string_view part;  ///< of the way to the device
    const char* transport;
};

// In this order: a USB case can hold a SATA drive, a SAS controller too.
constexpr std::array<Attachment, 11> kAttachments = {{{"/usb", "usb"},
                                                      {"/nvme", "nvme"},
                                                      {"/virtio", "virtio"},
                                                      {"/mmc", "mmc"},
                                                      {"/end_device-", "sas"},
                                                      {"/rport-", "fibre channel"},
                                                      {"/session", "iscsi"},
                                                      {"/ata", "sata"},
                                                      {"/vbd-", "xen"},
                                                      {"/ide", "ide"},
                                                      {"/host", "scsi"}}};

std::optional<std::string> transportOf(const Host& host, const std::string& name) {
    const std::string way = host.resolved(block::directory(name)).value_or("");
    const auto found = std::find_if(kAttachments.begin(), kAttachments.end(), [&way](const Attachment& one) {
        return way.find(one.part) != std::string::npos;
    });
    return found == kAttachments.end() ? std::nullopt : std::optional<std::string>(found->transport);
}

/// The first of the files that says something.
std::optional<std::string> firstLine(const Host& host, const std::string& directory,
                                     std::initializer_list<const char*> files) {
    for (const char* file : files) {
        if (auto line = host.line(directory + "/" + file)) {
            return line;
        }
    }
    return std::nullopt;
}

/// The serial number behind the four bytes of its head.
std::optional<std::string> serialPage(const Host& host, const std::string& directory) {
    constexpr std::size_t kHead = 4;
    const std::string page = host.text(directory + "/device/vpd_pg80").value_or("");
    return page.size() > kHead ? std::optional(printable(trimmed(page.substr(kHead)))) : std::nullopt;
}

/// Numbers of a vendor (PCI's, an eMMC's) are no names.
std::optional<std::string> makerOf(const Host& host, const std::string& directory) {
    const auto maker = host.line(directory + "/device/vendor");
    return maker && (maker->starts_with("0x") || *maker == "ATA") ? std::nullopt : maker;
}

void identify(const Host& host, const std::string& directory, Found& found) {
    const block::UdevFacts udev = block::udevFacts(host, found.name);
    auto serial = firstLine(host, directory, {"device/serial", "serial"});
    serial = serial ? serial : serialPage(host, directory);
    const auto wwn = firstLine(host, directory, {"wwid", "device/wwid"});
    found.facts.text(kSerial, serial ? serial : block::fact(udev, "ID_SERIAL_SHORT"));
    found.facts.text(kWwn, wwn ? wwn : block::fact(udev, "ID_WWN"));
}

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
    facts.text(kTransport, transportOf(host, found.name));
    facts.text(kMaker, makerOf(host, directory));
    facts.text(kModel, firstLine(host, directory, {"device/model", "device/name"}));
    if (host.privileged()) {
        identify(host, directory, found);
    }
    facts.text(kFirmware, firstLine(host, directory, {"device/firmware_rev", "device/rev", "device/fwrev"}));
    facts.number(kSize, block::sizeOf(host, found.name));
    facts.number(kLogicalBlock, host.number(directory + "/queue/logical_block_size"));
    facts.number(kPhysicalBlock, host.number(directory + "/queue/physical_block_size"));
    facts.flag(kRotational, host.flag(directory + "/queue/rotational"));
    facts.flag(kRemovable, host.flag(directory + "/removable"));
    facts.flag(kReadOnly, host.flag(directory + "/ro"));
    block::count(host, found.name, {kReads, kReadBytes, kWrites, kWrittenBytes}, facts);
    facts.number(kErrors, host.number(directory + "/device/ioerr_cnt"));
}

}  // namespace hardware
