#include "plugins/hardware/storage/drive_health.h"

#include <algorithm>
#include <array>

#include "plugins/hardware/storage/block.h"
#include "plugins/hardware/storage/devices.h"
#include "plugins/hardware/storage/identity.h"

namespace hardware {

namespace {

bool isController(const std::string& name) {
    constexpr std::string_view kPrefix = "nvme";
    return name.starts_with(kPrefix) && asNumber(name.substr(kPrefix.size()));
}

/// The controller of a name space; of several that lead to it, the first that works.
std::optional<DeviceFile> controllerOf(const Host& host, const std::string& device) {
    const std::string way = host.resolved(device).value_or("");
    const std::string own = way.substr(way.rfind('/') + 1);
    const std::vector<std::string> names =
        isController(own) ? std::vector<std::string>{""} : host.entries(device);
    for (const std::string& name : names) {
        const std::string directory = device + "/" + name;
        const auto number = host.line(directory + "/dev");
        if ((name.empty() || isController(name)) && number && host.line(directory + "/state") == "live" &&
            host.line(directory + "/device/power/runtime_status") != "suspended") {
            return DeviceFile{"/dev/" + (name.empty() ? own : name), *number, "",
                              DeviceFile::Sort::character};
        }
    }
    return std::nullopt;
}

bool isDiskAtWork(const Host& host, const std::string& device) {
    return host.number(device + "/type") == 0ULL && host.line(device + "/state") == "running";
}

/// Whom to ask; nothing when nobody may be asked.
std::optional<HealthSource> sourceOf(const Host& host, const std::string& name,
                                     const std::string& transport) {
    if (!host.privileged() || host.devices() == nullptr || block::isSuspended(host, name)) {
        return std::nullopt;
    }
    const std::string device = block::directory(name) + "/device";
    if (transport == "nvme") {
        const auto controller = controllerOf(host, device);
        return controller ? std::optional(HealthSource{HealthWay::nvme, *controller}) : std::nullopt;
    }
    constexpr std::array<std::string_view, 5> kAsked = {"sata", "ata", "sas", "fibre channel", "scsi"};
    if (std::find(kAsked.begin(), kAsked.end(), transport) == kAsked.end() || !isDiskAtWork(host, device)) {
        return std::nullopt;
    }
    const bool ata = host.line(device + "/vendor") == "ATA";
    return HealthSource{ata ? HealthWay::ata : HealthWay::scsi, block::fileOf(host, name)};
}

/// An eMMC's life is in files: in tenths, of two sorts of memory.
void addLife(const Host& host, const std::string& device, const HealthIds& ids, Facts& facts) {
    const std::string life = host.line(device + "/life_time").value_or("");
    const std::size_t blank = std::min(life.find(' '), life.size());
    const auto one = asNumber(life.substr(0, blank));
    const auto other = asNumber(trimmed(life.substr(blank)));
    const unsigned long long tenths = std::max(one.value_or(0), other.value_or(0));
    if (tenths >= 1 && tenths <= 11) {  // 0 stands for "not known", 11 for "beyond its end"
        facts.number(ids.worn, tenths * 10);
    }
    const unsigned long long spare = host.number(device + "/pre_eol_info").value_or(0);
    if (spare == 2 || spare == 3) {
        facts.texts(ids.warnings, {"spare blocks run out"});
    }
}

}  // namespace

void addHealth(const Host& host, const std::string& name, const std::string& transport, const HealthIds& ids,
               Facts& facts) {
    if (transport == "mmc") {
        addLife(host, block::directory(name) + "/device", ids, facts);
    }
    if (block::isSuspended(host, name)) {
        facts.text(ids.power, "standby");
        return;
    }
    const auto source = sourceOf(host, name, transport);
    if (!source) {
        return;
    }
    const std::optional<Health> health = host.devices()->health(*source);
    if (!health) {
        for (const Id id :
             {ids.power, ids.temperature, ids.worn, ids.spare, ids.hours, ids.warnings, ids.mediaErrors}) {
            facts.unanswered(id);
        }
        return;
    }
    facts.text(ids.power, health->power);
    facts.real(ids.temperature, health->temperature);
    facts.number(ids.worn, health->worn);
    facts.number(ids.spare, health->spare);
    facts.number(ids.hours, health->hours);
    facts.texts(ids.warnings, health->warnings);
    facts.number(ids.mediaErrors, health->mediaErrors);
}

bool isAwake(const Host& host, const std::string& name) {
    if (host.devices() == nullptr) {
        return true;
    }
    if (host.flag(block::directory(name) + "/queue/rotational") == false) {
        return !block::isSuspended(host, name);
    }
    const auto source = sourceOf(host, name, transportOf(host, name).value_or(""));
    const auto health = source ? host.devices()->health(*source) : std::nullopt;
    return health && (health->power == "active" || health->power == "idle");
}

}  // namespace hardware
