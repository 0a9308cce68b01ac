// Sensors as drivers of all kinds show them, and as broken ones do.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>

#include "plugins/hardware/sensor/chips.h"
#include "plugins/hardware/sensor/sensors.h"
#include "tests/hardware/recorded_host.h"

namespace {

using hardware::Class;
using testing::ElementsAre;
using testing::IsEmpty;

class Sensors : public testing::Test {
protected:
    /// A chip at a device of a bus; its files follow with file().
    std::string chip(const std::string& name, const std::string& device, const std::string& bus) {
        const std::string own = "/sys/devices/" + device + "/hwmon/hwmon" + std::to_string(count_);
        recorded_.file(own + "/name", name);
        recorded_.link("/sys/class/hwmon/hwmon" + std::to_string(count_++), recorded_.root() + own);
        if (!bus.empty()) {
            recorded_.link(own + "/device", recorded_.root() + "/sys/devices/" + device);
            std::filesystem::remove(recorded_.root() + "/sys/devices/" + device + "/subsystem");
            recorded_.link("/sys/devices/" + device + "/subsystem", "/sys/bus/" + bus);
        }
        return own;
    }
    std::vector<std::string> names() const {
        std::vector<std::string> all;
        for (const hardware::Chip& one : hardware::chips(recorded_.host())) {
            all.push_back(one.name);
        }
        return all;
    }
    std::string fact(const std::string& sensor, const std::string& property) const {
        return told(recorded_.host(), Class::sensor, sensor, property);
    }

    RecordedHost recorded_;
    int count_ = 0;
};

struct Place {
    const char* name;
    const char* device;
    const char* bus;
    const char* expected;
};

// As sensors (lm-sensors 3.6) names the same trees.
constexpr Place kPlaces[] = {
    {"coretemp", "platform/coretemp.1", "platform", "coretemp-isa-0001"},
    {"nct6798", "platform/nct6775.656", "platform", "nct6798-isa-0290"},
    {"pwmfan", "platform/1e6e0000.pwm-fan", "platform", "pwmfan-isa-0000"},
    {"k10temp", "pci0000:00/0000:00:18.3", "pci", "k10temp-pci-00c3"},
    {"k10temp", "pci0001:00/0001:00:18.3", "pci", "k10temp-pci-100c3"},
    {"lm75", "i2c-1/1-0048", "i2c", "lm75-i2c-1-48"},
    {"jc42", "i2c-12/12-0009", "i2c", "jc42-i2c-12-09"},
    {"corsaircpro", "usb1/0003:1B1C:0C10.0001", "hid", "corsaircpro-hid-3-1"},
    {"drivetemp", "ata2/1:0:3:2", "scsi", "drivetemp-scsi-1-32"},
    {"adcxx", "platform/spi0.1", "spi", "adcxx-spi-0-1"},
    {"power_meter", "LNXSYSTM:00/ACPI000D:00", "acpi", "power_meter-acpi-0"},
    {"r8169_0_100:00", "mdio/r8169-0-100:00", "mdio_bus", "r8169_0_100:00-mdio-0"},
    {"mcp9800", "usb2/2-1:1.0", "usb", "mcp9800-virtual-0"},
    {"acpitz", "virtual/thermal/thermal_zone0", "thermal", "acpitz-virtual-0"},
    {"alone", "virtual/x", "", "alone-virtual-0"},
    // What no kernel should show.
    {"odd", "pci/0000", "pci", "odd-pci-0000"},
    {"odd", "pci/:.:.:.:.zz", "pci", "odd-pci-0000+"},
    {"odd", "i2c/nodash", "i2c", "odd-i2c-nodash-00"},
    {"odd", "i2c/-", "i2c", "odd-i2c--00"},
    {"odd", "i2c/1-123456789abc", "i2c", "odd-i2c-1-00"},
    {"odd", "spi/x", "spi", "odd-spi--0"},
    {"odd", "scsi/::::::", "scsi", "odd-scsi--0"},
    {"odd", "hid/.", "hid", "odd-hid-0-0"},
};

TEST_F(Sensors, ChipsHaveTheNamesThatPeopleKnow) {
    std::vector<std::string> expected;
    for (const Place& place : kPlaces) {
        chip(place.name, place.device, place.bus);
        expected.emplace_back(place.expected);
    }
    EXPECT_EQ(names(), expected);
}

TEST_F(Sensors, AChipOfAClassSitsWhereItsDeviceSits) {
    chip("nvme", "0000:03:00.0/nvme/nvme0", "nvme");
    recorded_.link("/sys/devices/0000:03:00.0/nvme/nvme0/device", "../../../0000:03:00.0");
    recorded_.link("/sys/devices/0000:03:00.0/subsystem", "/sys/bus/pci");
    EXPECT_THAT(names(), ElementsAre("nvme-pci-0300"));
}

TEST_F(Sensors, DevicesThatLeadInACircleAreOnNoBus) {
    const std::string one = chip("one", "a", "");
    recorded_.link(one + "/device", "device");
    const std::string two = chip("two", "b", "thermal");
    recorded_.link("/sys/devices/b/device", ".");
    EXPECT_THAT(names(), ElementsAre("one-virtual-0", "two-virtual-0"));
}

TEST_F(Sensors, ChipsOfOneNameStayApart) {
    recorded_.file(chip("a/b", "x", "") + "/temp1_input", "1000");
    recorded_.file(chip("a/b", "y", "") + "/temp1_input", "2000");
    chip("", "z", "");
    EXPECT_THAT(listed(recorded_.host(), Class::sensor),
                ElementsAre("a!b-virtual-0:temp1", "a!b-virtual-0+:temp1"));
    EXPECT_EQ(fact("a!b-virtual-0+:temp1", "Temperature"), "2");
}

TEST_F(Sensors, OnlyWhatIsMeasuredIsOne) {
    const std::string own = chip("x", "a", "");
    for (const char* file : {"temp1_input", "temp1_max", "temp10_input", "temp2_input", "fan1_input",
                             "in0_input", "power1_average", "power1_input", "power2_average", "curr1_input",
                             "humidity1_input", "energy1_input",
                             // and these are none
                             "temp_input", "tempx_input", "temp1_average", "pwm1_input", "intrusion0_input",
                             "in_input", "temp1_crit", "_input", "input", "temp0x1_average", "freq1_input"}) {
        recorded_.file(own + "/" + file, "1000");
    }
    std::vector<std::string> sensors = listed(recorded_.host(), Class::sensor);
    for (std::string& name : sensors) {
        name = name.substr(name.find(':') + 1);
    }
    EXPECT_THAT(sensors, ElementsAre("curr1", "energy1", "fan1", "humidity1", "in0", "power1", "power2",
                                     "temp1", "temp2", "temp10"));
}

TEST_F(Sensors, ValuesAreInTheUnitOfTheirRow) {
    const std::string own = chip("x", "a", "");
    for (const char* sensor : {"temp1", "fan1", "in1", "curr1", "power1", "energy1", "humidity1"}) {
        recorded_.file(own + "/" + sensor + "_input", "1500000");
    }
    EXPECT_EQ(fact("x-virtual-0:temp1", "Temperature"), "1500");
    EXPECT_EQ(fact("x-virtual-0:fan1", "FanSpeed"), "1500000");
    EXPECT_EQ(fact("x-virtual-0:in1", "Voltage"), "1500");
    EXPECT_EQ(fact("x-virtual-0:curr1", "Current"), "1500");
    EXPECT_EQ(fact("x-virtual-0:power1", "Power"), "1.5");
    EXPECT_EQ(fact("x-virtual-0:energy1", "Energy"), "1.5");
    EXPECT_EQ(fact("x-virtual-0:humidity1", "Humidity"), "1500");
}

TEST_F(Sensors, AValueThatCannotBeReadIsNotTold) {
    const std::string own = chip("x", "a", "");
    for (const char* wrong : {"", "nan", "1.5", "99999999999999999999", "--1"}) {
        recorded_.file(own + "/temp1_input", wrong);
        EXPECT_EQ(fact("x-virtual-0:temp1", "Temperature"), "") << wrong;
        EXPECT_EQ(fact("x-virtual-0:temp1", "Chip"), "x-virtual-0");
    }
    recorded_.remove(own + "/temp1_input");
    recorded_.file(own + "/temp1_input/",
                   "");  // reading fails with an error, as with a chip that does not answer
    EXPECT_EQ(fact("x-virtual-0:temp1", "Temperature"), "");
}

TEST_F(Sensors, AnAverageStandsForAValue) {
    const std::string own = chip("x", "a", "");
    recorded_.file(own + "/power1_average", "2000000");
    EXPECT_EQ(fact("x-virtual-0:power1", "Power"), "2");
    recorded_.file(own + "/power1_input", "3000000");
    EXPECT_EQ(fact("x-virtual-0:power1", "Power"), "3");
}

TEST_F(Sensors, LimitsAreThoseOfTheChip) {
    const std::string own = chip("x", "a", "");
    recorded_.file(own + "/temp1_input", "20000");
    const std::pair<const char*, const char*> limits[] = {{"lcrit", "LowCriticalLimit"},
                                                          {"min", "LowLimit"},
                                                          {"max", "HighLimit"},
                                                          {"crit", "CriticalLimit"},
                                                          {"emergency", "EmergencyLimit"}};
    int value = -40;
    for (const auto& [file, name] : limits) {
        EXPECT_EQ(fact("x-virtual-0:temp1", name), "");
        recorded_.file(own + "/temp1_" + file, std::to_string(value) + "000");
        EXPECT_EQ(fact("x-virtual-0:temp1", name), std::to_string(value));
        value += 30;
    }
}

TEST_F(Sensors, AnAlarmOfAnyLimitIsOne) {
    const std::string own = chip("x", "a", "");
    recorded_.file(own + "/in0_input", "1");
    EXPECT_EQ(fact("x-virtual-0:in0", "Alarm"), "");
    recorded_.file(own + "/in0_min_alarm", "0");
    EXPECT_EQ(fact("x-virtual-0:in0", "Alarm"), "false");
    recorded_.file(own + "/in0_crit_alarm", "1");
    EXPECT_EQ(fact("x-virtual-0:in0", "Alarm"), "true");
}

TEST_F(Sensors, ABrokenOneHasNoValue) {
    const std::string own = chip("x", "a", "");
    recorded_.file(own + "/temp1_input", "-40000");
    recorded_.file(own + "/temp1_fault", "0");
    EXPECT_EQ(fact("x-virtual-0:temp1", "Temperature"), "-40");
    EXPECT_EQ(fact("x-virtual-0:temp1", "Fault"), "false");
    recorded_.file(own + "/temp1_fault", "1");
    EXPECT_EQ(fact("x-virtual-0:temp1", "Temperature"), "");
    EXPECT_EQ(fact("x-virtual-0:temp1", "Fault"), "true");
}

TEST_F(Sensors, ThatAreGoneHaveNoFacts) {
    chip("x", "a", "");
    for (const char* name :
         {"y-virtual-0:temp1", "x-virtual-0:pwm1", "x-virtual-0:", ":", "", "thermal_zone7"}) {
        EXPECT_EQ(told(recorded_.host(), Class::sensor, name), "") << name;
    }
}

TEST_F(Sensors, ZonesAreThoseThatNoChipCovers) {
    const auto zone = [this](const std::string& number, const std::string& type,
                             const std::string& temperature) {
        recorded_.file("/sys/class/thermal/thermal_zone" + number + "/type", type);
        recorded_.file("/sys/class/thermal/thermal_zone" + number + "/temp", temperature);
    };
    zone("0", "cpu-thermal", "48199");
    zone("1", "x86_pkg_temp", "50000");
    zone("2", "pch", "51500");
    recorded_.file("/sys/class/thermal/cooling_device0/type", "Fan");
    EXPECT_THAT(listed(recorded_.host(), Class::sensor),
                ElementsAre("thermal_zone0", "thermal_zone1", "thermal_zone2"));
    chip("cpu_thermal", "a", "");
    EXPECT_THAT(listed(recorded_.host(), Class::sensor), ElementsAre("thermal_zone1", "thermal_zone2"));
    chip("coretemp", "b", "");
    EXPECT_THAT(listed(recorded_.host(), Class::sensor), ElementsAre("thermal_zone2"));
    recorded_.file("/sys/class/thermal/thermal_zone2/trip_point_0_type", "passive");
    recorded_.file("/sys/class/thermal/thermal_zone2/trip_point_0_temp", "80000");
    recorded_.file("/sys/class/thermal/thermal_zone2/trip_point_1_type", "critical");
    recorded_.file("/sys/class/thermal/thermal_zone2/trip_point_1_temp", "120000");
    EXPECT_EQ(told(recorded_.host(), Class::sensor, "thermal_zone2"),
              "Label: pch\nTemperature: 51.5 degrees Celsius\nCriticalLimit: 120 as the value\n");
}

TEST_F(Sensors, TheDeviceThatIsAskedIsTheChip) {
    EXPECT_EQ(hardware::chipOf("coretemp-isa-0000:temp1"), "coretemp-isa-0000");
    EXPECT_EQ(hardware::chipOf("r8169_0_100:00-mdio-0:temp1"), "r8169_0_100:00-mdio-0");
    EXPECT_EQ(hardware::chipOf("thermal_zone0"), "thermal_zone0");
    EXPECT_EQ(sourceOf(Class::sensor).device, &hardware::chipOf);
}

}  // namespace
