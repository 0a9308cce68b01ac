#include "plugins/hardware/sensor/sensors.h"

#include <algorithm>
#include <array>
#include <string_view>

#include "plugins/hardware/sensor/chips.h"
#include "plugins/hardware/storage/drive_health.h"

namespace hardware {

namespace {

constexpr auto kType = Class::sensor;
constexpr auto kZones = "/sys/class/thermal/";

enum : Id {
    kChip = firstId(kType) + 1,
    kLabel,
    kTemperature,
    kFan,
    kVoltage,
    kCurrent,
    kPower,
    kEnergy,
    kHumidity,
    kLow,
    kHigh,
    kCritical,
    kAlarm,
    kFault,
    kLowCritical,
    kEmergency,
};

constexpr Row row(Id id, const char* name, Kind kind, const char* unit, const char* source,
                  const char* meaning, bool live = true) {
    return {kType, id, name, kind, unit, source, meaning, Audience::everybody, live};
}

constexpr Row kRows[] = {
    row(kChip, "Chip", Kind::text, "", "name in /sys/class/hwmon/hwmon*", "the chip and where it sits",
        false),
    row(kLabel, "Label", Kind::text, "", "*_label", "what is measured", false),
    row(kTemperature, "Temperature", Kind::number, "degrees Celsius", "temp*_input", "the temperature now"),
    row(kFan, "FanSpeed", Kind::number, "revolutions per minute", "fan*_input", "how fast the fan turns now"),
    row(kVoltage, "Voltage", Kind::number, "volts", "in*_input", "the voltage now"),
    row(kCurrent, "Current", Kind::number, "amperes", "curr*_input", "the current now"),
    row(kPower, "Power", Kind::number, "watts", "power*_input or power*_average", "the power drawn now"),
    row(kEnergy, "Energy", Kind::number, "joules", "energy*_input", "the energy used so far"),
    row(kHumidity, "Humidity", Kind::number, "percent", "humidity*_input", "the relative humidity now"),
    row(kLow, "LowLimit", Kind::number, "as the value", "*_min", "what is too low"),
    row(kHigh, "HighLimit", Kind::number, "as the value", "*_max", "what is too high"),
    row(kCritical, "CriticalLimit", Kind::number, "as the value", "*_crit", "what does harm"),
    row(kAlarm, "Alarm", Kind::flag, "", "*_alarm, *_min_alarm, *_max_alarm, *_crit_alarm and others",
        "whether the chip gives an alarm"),
    row(kFault, "Fault", Kind::flag, "", "*_fault", "whether the sensor is broken; it then has no value"),
    row(kLowCritical, "LowCriticalLimit", Kind::number, "as the value", "*_lcrit",
        "what does harm by being too low"),
    row(kEmergency, "EmergencyLimit", Kind::number, "as the value", "*_emergency",
        "beyond the critical limit: what stops the chip"),
};

struct Sort {
    std::string_view prefix;  ///< of its files
    Id value;
    double perUnit;  ///< how many of what the kernel counts make the unit of the row
};

constexpr std::array<Sort, 7> kSorts = {{{"temp", kTemperature, 1e3},
                                         {"fan", kFan, 1},
                                         {"in", kVoltage, 1e3},
                                         {"curr", kCurrent, 1e3},
                                         {"power", kPower, 1e6},
                                         {"energy", kEnergy, 1e6},
                                         {"humidity", kHumidity, 1e3}}};

/// "temp12": the sort of sensor; null for what is none.
const Sort* sortOf(const std::string& sensor) {
    const auto found = std::find_if(kSorts.begin(), kSorts.end(), [&](const Sort& sort) {
        return sensor.starts_with(sort.prefix) && asNumber(sensor.substr(sort.prefix.size()));
    });
    return found == kSorts.end() ? nullptr : &*found;
}

/// The sensors of a chip: "fan1", "in0", "temp2".
std::vector<std::string> sensorsOf(const Host& host, const Chip& chip) {
    std::vector<std::string> names;
    for (const std::string& file : host.entries(chip.directory)) {
        const std::size_t end = file.rfind('_');
        const std::string ending = end == std::string::npos ? "" : file.substr(end);
        const std::string sensor = file.substr(0, end == std::string::npos ? 0 : end);
        if ((ending == "_input" || (ending == "_average" && sensor.starts_with("power"))) &&
            sortOf(sensor) != nullptr && (names.empty() || names.back() != sensor)) {
            names.push_back(sensor);
        }
    }
    return names;
}

/// Whether a chip shows the zone's temperature. Zones of one type share a chip, which is named after the type
/// and sits at the first of them; the package's zone is a sensor of coretemp.
bool isCovered(const Host& host, const std::string& zone, const std::vector<std::string>& chipSorts) {
    std::string type = host.line(kZones + zone + "/type").value_or("");
    std::replace(type.begin(), type.end(), '-', '_');
    return std::any_of(chipSorts.begin(), chipSorts.end(), [&type](const std::string& sort) {
        return sort == type || (type == "x86_pkg_temp" && sort == "coretemp");
    });
}

/// A drive that sleeps would be woken by its temperature being read: its driver asks it each time.
bool letsSleep(const Host& host, const Chip& chip) {
    const auto drives = chip.sort == "drivetemp" ? host.entries(chip.directory + "/device/block")
                                                 : std::vector<std::string>();
    return std::any_of(drives.begin(), drives.end(),
                       [&host](const std::string& drive) { return !isAwake(host, drive); });
}

std::optional<double> measured(const Host& host, const std::string& file, double perUnit) {
    const auto count = host.signedNumber(file);
    return count ? std::optional(static_cast<double>(*count) / perUnit) : std::nullopt;
}

void describeZone(const Host& host, Found& found) {
    const std::string zone = kZones + found.name;
    found.facts.text(kLabel, host.line(zone + "/type"));
    found.facts.real(kTemperature, measured(host, zone + "/temp", 1e3));
    for (const std::string& entry : host.entries(zone)) {
        if (entry.ends_with("_type") && host.line(zone + "/" + entry) == "critical") {
            const std::string point = entry.substr(0, entry.size() - 5);
            found.facts.real(kCritical, measured(host, zone + "/" + point + "_temp", 1e3));
        }
    }
}

/// Some chips give one alarm, others one for each limit. Nothing where there is none.
std::optional<bool> alarmOf(const Host& host, const std::string& file) {
    std::optional<bool> any;
    for (const char* ending :
         {"_alarm", "_min_alarm", "_max_alarm", "_crit_alarm", "_lcrit_alarm", "_emergency_alarm"}) {
        if (const auto alarm = host.flag(file + ending)) {
            any = any.value_or(false) || *alarm;
        }
    }
    return any;
}

}  // namespace

Rows sensorRows() {
    return kRows;
}

std::vector<std::string> listSensors(const Host& host) {
    std::vector<std::string> names;
    std::vector<std::string> sorts;
    for (const Chip& chip : chips(host)) {
        sorts.push_back(chip.sort);
        for (const std::string& sensor : sensorsOf(host, chip)) {
            names.push_back(chip.name + ":" + sensor);
        }
    }
    for (const std::string& zone : host.entries(kZones)) {
        if (zone.starts_with("thermal_zone") && !isCovered(host, zone, sorts)) {
            names.push_back(zone);
        }
    }
    return names;
}

std::string chipOf(const std::string& name) {
    return name.substr(0, name.rfind(':'));
}

void describeSensor(const Host& host, Found& found) {
    const std::size_t colon = found.name.rfind(':');
    if (colon == std::string::npos) {
        describeZone(host, found);
        return;
    }
    const std::string sensor = found.name.substr(colon + 1);
    const Sort* const sort = sortOf(sensor);
    const std::optional<Chip> chip = findChip(host, chipOf(found.name));
    if (sort == nullptr || !chip) {
        return;
    }
    const std::string file = chip->directory + "/" + sensor;
    Facts& facts = found.facts;
    facts.text(kChip, chip->name);
    facts.text(kLabel, host.line(file + "_label"));
    const std::optional<bool> fault = host.flag(file + "_fault");
    if (fault != true && !letsSleep(host, *chip)) {
        const auto value = measured(host, file + "_input", sort->perUnit);
        facts.real(sort->value, value ? value : measured(host, file + "_average", sort->perUnit));
    }
    facts.real(kLow, measured(host, file + "_min", sort->perUnit));
    facts.real(kHigh, measured(host, file + "_max", sort->perUnit));
    facts.real(kCritical, measured(host, file + "_crit", sort->perUnit));
    facts.real(kLowCritical, measured(host, file + "_lcrit", sort->perUnit));
    facts.real(kEmergency, measured(host, file + "_emergency", sort->perUnit));
    facts.flag(kAlarm, alarmOf(host, file));
    facts.flag(kFault, fault);
}

}  // namespace hardware
