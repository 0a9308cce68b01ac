// The computer, its processors, drives and partitions.
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cstring>
#include <ctime>
#include <sstream>

#include "agent/core/text.h"
#include "agent/verify/fact.h"
#include "framework/qx/whole_number.h"
#include "hosttools/files.h"

namespace cvagent::verify {

namespace {

using Megahertz = double;

std::string kernelsHostName() {
    std::array<char, 256> name{};
    gethostname(name.data(), name.size() - 1);
    return name.data();
}

Text hostName(const Kernel& /*kernel*/, const Fact& /*fact*/) {
    return kernelsHostName();
}

Text shortHostName(const Kernel& /*kernel*/, const Fact& /*fact*/) {
    const std::string whole = kernelsHostName();
    return whole.substr(0, whole.find('.'));
}

/// The whole name stands first in the lines of /etc/hosts that have the host's. Where there are none, only a
/// name server knows it.
std::vector<std::string> wholeHostNames() {
    const std::string own = kernelsHostName();
    std::istringstream lines = linesOf("/etc/hosts");
    std::vector<std::string> found;
    for (std::string line; std::getline(lines, line);) {
        std::istringstream words(line.substr(0, line.find('#')));
        std::string address;
        std::string whole;
        bool isOwn = words >> address >> whole && whole == own;
        for (std::string alias; words >> alias;) {
            isOwn = isOwn || alias == own;
        }
        if (isOwn) {
            found.push_back(whole);
        }
    }
    return found;
}

Text domainName(const Kernel& /*kernel*/, const Fact& fact) {
    Text domain;
    for (const std::string& whole : wholeHostNames()) {
        const std::size_t dot = std::min(whole.find('.'), whole.size() - 1);
        const std::string found = whole.substr(dot + 1);
        domain = found == fact.shown ? found : domain.value_or(found);
    }
    return domain;
}

/// What is shown has been read a moment ago.
Text currentTime(const Kernel& /*kernel*/, const Fact& fact) {
    constexpr long long kMoment = 30;
    const long long now = std::time(nullptr);
    const auto shown = QX::wholeNumber<long long>(fact.shown);
    return shown && *shown <= now && *shown > now - kMoment ? fact.shown : std::to_string(now);
}

/// As the C library has it from /etc/localtime.
Text timeZone(const Kernel& /*kernel*/, const Fact& /*fact*/) {
    constexpr long kMinute = 60;
    const std::time_t now = std::time(nullptr);
    std::tm local{};
    tzset();
    localtime_r(&now, &local);
    return std::to_string(local.tm_gmtoff / kMinute);
}

/// In the order of /proc/cpuinfo; nothing when it tells no such processor's.
std::optional<Megahertz> clockNow(unsigned int processor) {
    std::istringstream lines = linesOf("/proc/cpuinfo");
    for (std::string line; std::getline(lines, line);) {
        Megahertz speed = 0;
        if (line.starts_with("cpu MHz") && --processor == 0 &&
            std::istringstream(line.substr(line.find(':') + 1)) >> speed) {
            return speed;
        }
    }
    return std::nullopt;
}

Megahertz clockLimit(unsigned int processor, const char* file, Megahertz fallback) {
    constexpr Megahertz kKilo = 1000;
    const std::string path = "/sys/devices/system/cpu/cpu" + std::to_string(processor - 1) + "/cpufreq/";
    const auto kilohertz = hosttools::readNumber(path + file);
    return kilohertz == 0 ? fallback : static_cast<Megahertz>(kilohertz) / kKilo;
}

/// A clock goes up and down with the load: anything is right between its limits, and close to what it is now.
Text clockSpeed(const Kernel& /*kernel*/, const Fact& fact) {
    constexpr Megahertz kClose = 0.1;
    const auto now = clockNow(fact.index);
    const auto shown = QX::wholeNumber<unsigned int>(fact.shown);
    if (!now || !shown) {
        return kNone;
    }
    const Megahertz least = std::min(*now, clockLimit(fact.index, "cpuinfo_min_freq", *now));
    const Megahertz most = std::max(*now, clockLimit(fact.index, "cpuinfo_max_freq", *now));
    const bool isRight = *shown >= least * (1 - kClose) && *shown <= most * (1 + kClose);
    return isRight ? fact.shown : std::to_string(static_cast<unsigned int>(*now));
}

std::string blockDevice(const std::string& device) {
    std::string name = device.starts_with("/dev/") ? device.substr(std::strlen("/dev/")) : device;
    std::ranges::replace(name, '/', '!');
    return "/sys/class/block/" + name;
}

/// In bytes; nothing when the kernel knows no such device.
std::optional<unsigned long long> deviceSize(const std::string& device) {
    constexpr unsigned long long kSector = 512;
    const auto size = hosttools::readFile(blockDevice(device) + "/size");
    const auto sectors = size ? hosttools::parseNumber(*size) : std::nullopt;
    return sectors ? std::optional(*sectors * kSector) : std::nullopt;
}

constexpr const char* kNoDevice = "there is no such device";

Text devicePath(const Kernel& /*kernel*/, const Fact& fact) {
    return deviceSize(fact.name) ? fact.name : kNoDevice;
}

template <unsigned unit>
Text sizeIn(const Kernel& /*kernel*/, const Fact& fact) {
    const auto size = deviceSize(fact.name);
    return size ? std::to_string(*size / unit) : kNoDevice;
}

/// The kernel shows an extended partition as a stub of at most two sectors.
Text partitionSize(const Kernel& kernel, const Fact& fact) {
    constexpr unsigned kKibi = 1024;
    const bool isExtended = deviceSize(fact.name).value_or(kKibi + 1) <= kKibi;
    return isExtended ? fact.shown : sizeIn<kKibi>(kernel, fact);
}

constexpr unsigned kThousand = 1000;
constexpr auto computer = NodeType::computer;

constexpr Check kHostChecks[] = {
    {NodeType::ipConfig, 97, 108, shortHostName},
    {NodeType::ipConfig, 98, 108, domainName},
    {computer, 108, 0, hostName},
    {computer, 126, 0, currentTime},
    {computer, 127, 0, timeZone},
    {NodeType::processor, 80, 0, clockSpeed, "the clock goes up and down with the load"},
    {NodeType::hardDrive, 37, 89, sizeIn<kThousand>},
    {NodeType::hardDrive, 89, 89, devicePath},
    {NodeType::partition, 89, 89, devicePath},
    {NodeType::partition, 108, 89, devicePath},
    {NodeType::partition, 112, 89, partitionSize},
};

}  // namespace

std::span<const Check> hostChecks() {
    return kHostChecks;
}

}  // namespace cvagent::verify
