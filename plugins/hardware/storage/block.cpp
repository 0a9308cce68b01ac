#include "plugins/hardware/storage/block.h"

#include <algorithm>
#include <limits>
#include <sstream>

namespace hardware::block {

namespace {

constexpr unsigned long long kSector = 512;  // the kernel counts in these, whatever the device has

/// "\x20" as udev writes what could mislead a reader of its links.
std::string decoded(const std::string& text) {
    std::string plain;
    for (std::size_t at = 0; at < text.size(); ++at) {
        const auto code = text.compare(at, 2, "\\x") == 0 && at + 4 <= text.size()
                              ? asNumber("0x" + text.substr(at + 2, 2))
                              : std::nullopt;
        plain += code ? static_cast<char>(*code) : text[at];
        at += code ? 3 : 0;
    }
    return plain;
}

/// Boot and replay-protected areas of an eMMC are no drives of their own.
bool isArea(const std::string& name) {
    return name.starts_with("mmcblk") &&
           (name.find("boot") != std::string::npos || name.find("rpmb") != std::string::npos);
}

}  // namespace

std::vector<std::string> all(const Host& host) {
    return host.entries("/sys/class/block");
}

std::string directory(const std::string& name) {
    return "/sys/class/block/" + name;
}

std::optional<Class> classOf(const Host& host, const std::string& name) {
    const std::string path = directory(name);
    if (host.exists(path + "/partition")) {
        const auto holder = holderOf(host, name);
        const bool known = holder && holder != name && !host.exists(directory(*holder) + "/partition") &&
                           classOf(host, *holder);
        return known ? std::optional(Class::partition) : std::nullopt;
    }
    if (host.flag(path + "/hidden").value_or(false)) {
        return std::nullopt;
    }
    if (host.exists(path + "/md")) {
        return Class::array;
    }
    if (host.exists(path + "/dm")) {
        return Class::mapping;
    }
    return host.exists(path + "/device") && !isArea(name) ? std::optional(Class::drive) : std::nullopt;
}

std::vector<std::string> ofClass(const Host& host, Class type) {
    std::vector<std::string> names = all(host);
    std::erase_if(names, [&](const std::string& name) { return classOf(host, name) != type; });
    return names;
}

std::optional<std::string> holderOf(const Host& host, const std::string& partition) {
    const std::string way = host.resolved(directory(partition) + "/..").value_or("");
    const std::string holder = way.substr(way.rfind('/') + 1);
    return holder.empty() ? std::nullopt : std::optional(holder);
}

DeviceFile fileOf(const Host& host, const std::string& name) {
    DeviceFile file{"/dev/" + name, number(host, name).value_or(""),
                    host.line(directory(name) + "/diskseq").value_or("")};
    std::replace(file.path.begin(), file.path.end(), '!', '/');
    return file;
}

bool isSuspended(const Host& host, const std::string& name) {
    const std::string path = directory(name);
    const std::string drive = host.exists(path + "/partition") ? path + "/.." : path;
    return host.line(drive + "/device/power/runtime_status") == "suspended";
}

std::optional<unsigned long long> bytes(std::optional<unsigned long long> sectors) {
    const bool fits = sectors && *sectors <= std::numeric_limits<unsigned long long>::max() / kSector;
    return fits ? std::optional(*sectors * kSector) : std::nullopt;
}

std::optional<unsigned long long> sizeOf(const Host& host, const std::string& name) {
    const auto sectors = host.number(directory(name) + "/size");
    return sectors != 0ULL ? bytes(sectors) : std::nullopt;
}

std::optional<std::string> number(const Host& host, const std::string& name) {
    return host.line(directory(name) + "/dev");
}

std::vector<std::string> slaves(const Host& host, const std::string& name) {
    return host.entries(directory(name) + "/slaves");
}

bool hasUdev(const Host& host) {
    return host.exists("/run/udev/data");
}

TextMap udevFacts(const Host& host, const std::string& name) {
    TextMap facts;
    const auto device = number(host, name);
    if (!device) {
        return facts;
    }
    for (const std::string& line : host.lines("/run/udev/data/b" + *device)) {
        const std::size_t end = line.find('=');
        if (line.starts_with("E:") && end != std::string::npos) {
            facts[line.substr(2, end - 2)] = printable(trimmed(decoded(line.substr(end + 1))));
        }
    }
    return facts;
}

void count(const Host& host, const std::string& name, const Counters& ids, Facts& facts) {
    std::istringstream stream(host.line(directory(name) + "/stat").value_or(""));
    unsigned long long reads = 0;
    unsigned long long readSectors = 0;
    unsigned long long writes = 0;
    unsigned long long writtenSectors = 0;
    unsigned long long other = 0;
    if (stream >> reads >> other >> readSectors >> other >> writes >> other >> writtenSectors) {
        facts.number(ids.reads, reads);
        facts.number(ids.readBytes, bytes(readSectors));
        facts.number(ids.writes, writes);
        facts.number(ids.writtenBytes, bytes(writtenSectors));
    }
}

}  // namespace hardware::block
