#include "plugins/hardware/bytes.h"
#include "plugins/hardware/storage/health.h"

// The layouts are those of SPC-4 and SBC-3.
namespace hardware {

namespace {

constexpr std::size_t kAnswer = 252;

enum class Page : std::uint8_t {
    supported = 0x00,
    temperature = 0x0d,
    solidState = 0x11,
    backgroundScan = 0x15,
    informationalExceptions = 0x2f,
};

/// The parameters of a log page; empty when the drive does not have it.
std::string logPage(const DeviceAccess& access, const DeviceFile& drive, Page page) {
    constexpr std::uint8_t kCurrentValues = 0x40;
    constexpr std::size_t kHead = 4;
    const auto code = static_cast<std::uint8_t>(page);
    const auto answer = access.scsi(
        drive, {0x4d, 0, static_cast<std::uint8_t>(kCurrentValues | code), 0, 0, 0, 0, 0, kAnswer, 0},
        kAnswer);
    if (!answer || answer->data.size() < kHead || (byteAt(answer->data, 0) & 0x3fU) != code) {
        return "";
    }
    return answer->data.substr(kHead, bigEndian(answer->data, 2, 2));
}

/// One parameter of a log page by its code; empty when the page does not have it.
std::string parameter(const std::string& page, unsigned int code) {
    constexpr std::size_t kHead = 4;
    for (std::size_t at = 0; at + kHead <= page.size(); at += kHead + byteAt(page, at + 3)) {
        if (bigEndian(page, at, 2) == code) {
            return page.substr(at + kHead, byteAt(page, at + 3));
        }
    }
    return "";
}

void setTemperature(std::uint8_t degrees, Health& health) {
    if (degrees != 0 && degrees != 0xff) {  // both are for "not known"
        health.temperature = degrees;
    }
}

void addException(const std::string& told, Health& health) {
    const std::uint8_t code = byteAt(told, 0);
    if (code == 0x5d) {
        health.warnings.emplace_back("failure predicted");
    } else if (code == 0x0b) {
        health.warnings.emplace_back(byteAt(told, 1) == 0x01 ? "temperature out of its limits"
                                                             : "reliability is degraded");
    }
    setTemperature(byteAt(told, 2), health);
}

/// Whether it sleeps or is stopped: what it tells of itself when it is asked for no work.
std::optional<std::string> powerState(const DeviceAccess& access, const DeviceFile& drive) {
    constexpr std::uint8_t kNotReady = 2;
    const auto sense = access.scsi(drive, {0x03, 0, 0, 0, kAnswer, 0}, kAnswer);
    if (!sense || sense->data.size() < 14 || (byteAt(sense->data, 0) & 0x7eU) != 0x70) {
        return std::nullopt;
    }
    if ((byteAt(sense->data, 2) & 0x0fU) == kNotReady) {
        return "not ready";
    }
    return byteAt(sense->data, 12) == 0x5e ? "standby" : "active";
}

}  // namespace

Health askScsi(const DeviceAccess& access, const DeviceFile& drive) {
    Health health;
    health.power = powerState(access, drive);
    if (health.power != "active") {
        return health;
    }
    const std::string pages = logPage(access, drive, Page::supported);
    const auto page = [&](Page wanted) {
        const bool has = pages.find(static_cast<char>(wanted)) != std::string::npos;
        return has ? logPage(access, drive, wanted) : "";
    };
    addException(parameter(page(Page::informationalExceptions), 0), health);
    setTemperature(byteAt(parameter(page(Page::temperature), 0), 1), health);
    const std::string worn = parameter(page(Page::solidState), 1);
    if (worn.size() >= 4) {
        health.worn = byteAt(worn, 3);
    }
    const std::string scan = parameter(page(Page::backgroundScan), 0);
    if (scan.size() >= 4) {
        health.hours = bigEndian(scan, 0, 4) / 60;
    }
    return health;
}

}  // namespace hardware
