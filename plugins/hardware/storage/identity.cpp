#include "plugins/hardware/storage/identity.h"

#include <algorithm>
#include <array>
#include <string_view>
#include <utility>

#include "plugins/hardware/storage/block.h"
#include "plugins/hardware/storage/bytes.h"

namespace hardware {

namespace {

using Text = std::optional<std::string>;

/// The first of the files that says something.
Text firstLine(const Host& host, const std::string& directory, std::initializer_list<const char*> files) {
    for (const char* file : files) {
        if (auto line = host.line(directory + "/" + file)) {
            return line;
        }
    }
    return std::nullopt;
}

Text firstOf(std::initializer_list<Text> texts) {
    for (const Text& text : texts) {
        if (text) {
            return text;
        }
    }
    return std::nullopt;
}

Text told(const std::string& text) {
    std::string plain = printable(trimmed(text));
    return plain.empty() ? std::nullopt : Text(std::move(plain));
}

/// The serial number behind the four bytes of its head, which tell how long it is.
Text serialPage(const Host& host, const std::string& device) {
    constexpr std::size_t kHead = 4;
    const std::string page = host.text(device + "/vpd_pg80").value_or("");
    return page.size() > kHead ? told(page.substr(kHead, bigEndian(page, 2, 2))) : std::nullopt;
}

/// A text in what an ATA drive tells of itself: two letters change places in each of its words. What SCSI
/// makes of it is cut off.
Text ataText(const Host& host, const std::string& device, std::size_t word, std::size_t count) {
    constexpr std::size_t kIdentity = 60;
    constexpr std::size_t kWhole = kIdentity + 512;
    const std::string page = host.text(device + "/vpd_pg89").value_or("");
    std::string text = page.size() >= kWhole ? page.substr(kIdentity + word * 2, count * 2) : "";
    for (std::size_t at = 0; at + 1 < text.size(); at += 2) {
        std::swap(text[at], text[at + 1]);
    }
    return told(text);
}

/// Numbers of a vendor (PCI's) are no names, nor is the word for all of ATA.
Text makerOf(const Host& host, const std::string& device) {
    const auto maker = host.line(device + "/vendor");
    return maker && (maker->starts_with("0x") || *maker == "ATA") ? std::nullopt : maker;
}

/// One that is made of model and serial number is no world-wide name.
Text nameOf(const Host& host, const std::string& directory) {
    const auto name = firstLine(host, directory, {"wwid", "device/wwid"});
    return name && name->starts_with("t10.") ? std::nullopt : name;
}

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
                                                      {"/ata", "ata"},
                                                      {"/vbd-", "xen"},
                                                      {"/ide", "ide"},
                                                      {"/host", "scsi"}}};

/// Whose bus it is, of the two that look the same: by the driver of the controller.
bool isSerialAta(const Host& host, const std::string& way) {
    const std::size_t start = way.find("/host");
    const std::string controller =
        start == std::string::npos ? "" : way.substr(start + 1, way.find('/', start + 1) - start - 1);
    const std::string driver = host.line("/sys/class/scsi_host/" + controller + "/proc_name").value_or("");
    return driver == "ahci" || driver.starts_with("sata");
}

}  // namespace

std::optional<std::string> transportOf(const Host& host, const std::string& name) {
    const std::string way = host.resolved(block::directory(name)).value_or("");
    const auto found = std::find_if(kAttachments.begin(), kAttachments.end(), [&way](const Attachment& one) {
        return way.find(one.part) != std::string::npos;
    });
    if (found == kAttachments.end()) {
        return std::nullopt;
    }
    return found->part == "/ata" && isSerialAta(host, way) ? "sata" : found->transport;
}

DriveIdentity identify(const Host& host, const std::string& name) {
    const std::string directory = block::directory(name);
    const std::string device = directory + "/device";
    const block::UdevFacts udev = block::udevFacts(host, name);
    const bool ata = host.line(device + "/vendor") == "ATA";
    const auto ataFact = [&](const char* key) { return ata ? block::fact(udev, key) : std::nullopt; };
    return {.maker = makerOf(host, device),
            .model = firstOf({ataText(host, device, 27, 20), ataFact("ID_MODEL_ENC"),
                              firstLine(host, device, {"model", "name"})}),
            .serial = firstOf({firstLine(host, directory, {"device/serial", "serial"}),
                               serialPage(host, device), block::fact(udev, "ID_SERIAL_SHORT")}),
            .firmware = firstOf({host.line(device + "/firmware_rev"), ataText(host, device, 23, 4),
                                 ataFact("ID_REVISION"), firstLine(host, device, {"rev", "fwrev"})}),
            .wwn = firstOf({nameOf(host, directory), block::fact(udev, "ID_WWN")})};
}

}  // namespace hardware
