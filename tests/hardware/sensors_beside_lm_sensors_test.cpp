// Sensors beside what `sensors` tells: those of the recorded hosts, whose files it finds below /sys in a
// mount namespace of its own, and those of this host.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>
#include <cmath>
#include <set>

#include "tests/hardware/recorded_hosts.h"
#include "tests/hardware/storage_host.h"
#include "tests/hardware/tools.h"
#include "tests/support/waiting.h"

namespace {

using hardware::Class;
using Json = nlohmann::json;
using Facts = std::map<std::string, std::string>;

const std::map<std::string, std::string> kValues = {
    {"temp", "Temperature"}, {"fan", "FanSpeed"},  {"in", "Voltage"},       {"curr", "Current"},
    {"power", "Power"},      {"energy", "Energy"}, {"humidity", "Humidity"}};
const std::map<std::string, std::string> kLimits = {{"min", "LowLimit"},
                                                    {"max", "HighLimit"},
                                                    {"crit", "CriticalLimit"},
                                                    {"lcrit", "LowCriticalLimit"},
                                                    {"emergency", "EmergencyLimit"},
                                                    {"fault", "Fault"}};

/// The property that one of its keys stands for: "temp1_max"; "" for those that the plug-in does not show.
std::string propertyOf(const std::string& sensor, const std::string& ending) {
    if (ending == "input" || ending == "average") {
        return kValues.at(sensor.substr(0, sensor.find_first_of("0123456789")));
    }
    const auto limit = kLimits.find(ending);
    return limit == kLimits.end() ? "" : limit->second;
}

bool same(const std::string& own, double theirs) {
    if (own == "true" || own == "false") {
        return (own == "true") == (theirs != 0);
    }
    return own.find_first_of("0123456789") != std::string::npos && std::abs(std::stod(own) - theirs) < 0.001;
}

/// What it tells of one sensor: its name, its label and its values by key.
struct Row {
    std::string name;
    std::string label;
    std::map<std::string, double> values;  ///< by what stands behind "temp1_"
};

std::vector<Row> rowsOf(const Json& chips) {
    std::vector<Row> rows;
    for (const auto& chip : chips.items()) {
        for (const auto& feature : chip.value().items()) {
            if (!feature.value().is_object() || feature.value().empty()) {
                continue;
            }
            const std::string first = feature.value().begin().key();
            const std::string sensor = first.substr(0, first.find('_'));
            Row row{chip.key() + ":" + sensor, feature.key() == sensor ? "" : feature.key(), {}};
            for (const auto& value : feature.value().items()) {
                row.values[value.key().substr(sensor.size() + 1)] = value.value();
            }
            rows.push_back(row);
        }
    }
    return rows;
}

bool isAlarm(const std::string& ending) {
    return ending.ends_with("alarm");
}

std::vector<std::string> differences(const hardware::Host& host, const Row& row) {
    const Facts own = hardware_test::factsOf(host, Class::sensor, row.name);
    const std::string sensor = row.name.substr(row.name.rfind(':') + 1);
    const auto fact = [&own](const std::string& property) {
        return own.contains(property) ? own.at(property) : "";
    };
    std::vector<std::string> all;
    bool alarm = false;
    for (const auto& [ending, value] : row.values) {
        alarm = alarm || (isAlarm(ending) && value != 0);
        const bool broken = ending == "input" && fact("Fault") == "true";  // the plug-in tells no value then
        const std::string property = broken ? "" : propertyOf(sensor, ending);
        if (!property.empty() && !same(fact(property), value)) {
            all.push_back(row.name + " " + property + ": " + fact(property) + ", not " +
                          std::to_string(value));
        }
    }
    if (fact("Chip") + ":" + sensor != row.name || fact("Label") != row.label ||
        (fact("Alarm") == "true") != alarm) {
        all.push_back(row.name + ": label " + fact("Label") + ", alarm " + fact("Alarm"));
    }
    return all;
}

/// What differs between the plug-in and what sensors tells; each a line.
std::vector<std::string> differences(const hardware::Host& host, const Json& chips) {
    std::set<std::string> own;
    for (const std::string& name : listed(host, Class::sensor)) {
        if (name.find(':') != std::string::npos) {  // zones are none of its chips
            own.insert(name);
        }
    }
    std::vector<std::string> all;
    for (const Row& row : rowsOf(chips)) {
        const bool measures =
            row.values.contains("input") || row.values.contains("average") || row.values.contains("fault");
        if (!measures) {
            continue;  // an alarm alone
        }
        if (own.erase(row.name) == 0) {
            all.push_back(row.name + " is missing");
            continue;
        }
        const std::vector<std::string> here = differences(host, row);
        all.insert(all.end(), here.begin(), here.end());
    }
    for (const std::string& name : own) {
        all.push_back(name + " is none of theirs");
    }
    return all;
}

bool hasChips(const hardware::Host& host) {
    return !host.entries("/sys/class/hwmon").empty();
}

/// Compares the sensors of a recorded host.
void compare(const RecordedHost& recorded) {
    const Json chips = hardware_test::printedJson(
        "unshare --user --map-root-user --mount sh -c 'mount --bind \"$0\" /sys && "
        "LD_PRELOAD=" CORVISTA_AS_SYSFS " exec sensors -j -c /dev/null' " +
        recorded.root() + "/sys");
    if (!chips.is_object() || chips.empty()) {
        GTEST_SKIP() << "no sensors, or no mount namespace for it";
    }
    EXPECT_THAT(differences(recorded.host(), chips), testing::IsEmpty());
}

class RecordedSensors : public testing::TestWithParam<std::string> {};

TEST_P(RecordedSensors, AreThoseOfLmSensors) {
    const RecordedHost recorded;
    recorded.unpack(recordedHosts() + "/" + GetParam() + "/files");
    if (hasChips(recorded.host())) {
        compare(recorded);
    }
}

TEST(SensorsOfEveryKind, AreThoseOfLmSensors) {
    const RecordedHost recorded;
    const std::string chip = "/sys/devices/virtual/hwmon/hwmon0/";
    recorded.file(chip + "name", "every");
    recorded.link("/sys/class/hwmon/hwmon0", "../../devices/virtual/hwmon/hwmon0");
    int value = 7000;
    for (const auto& [sensor, property] : kValues) {
        recorded.file(chip + sensor + "1_input", std::to_string(value += 1234));
    }
    for (const char* limit : {"temp1_lcrit", "temp1_min", "temp1_max", "temp1_crit", "temp1_emergency",
                              "in1_lcrit", "curr1_crit", "power1_max", "fan1_min"}) {
        recorded.file(chip + limit, std::to_string(value += 1234));
    }
    recorded.file(chip + "temp1_alarm", "1");
    recorded.file(chip + "humidity1_label", "the room");
    recorded.file(chip + "temp2_input", "-40000");
    recorded.file(chip + "temp2_fault", "1");
    compare(recorded);
}

INSTANTIATE_TEST_SUITE_P(All, RecordedSensors, testing::ValuesIn(namesOfRecordedHosts()), nameOfTest);

TEST(ThisHostsSensors, AreThoseOfLmSensors) {
    const hardware::Host host;
    const auto look = [] { return hardware_test::printedJson("sensors -j -c /dev/null"); };
    if (!hasChips(host) || !look().is_object()) {
        GTEST_SKIP() << "no sensors";
    }
    EXPECT_TRUE(eventually([&] { return differences(host, look()).empty(); }))  // values change
        << testing::PrintToString(differences(host, look()));
}

}  // namespace
