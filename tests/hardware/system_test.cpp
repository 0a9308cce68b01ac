// The system's own node: what firmware and kernel tell, and who may hear it.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/hardware/recorded_host.h"

namespace {

using hardware::Class;

class System : public testing::Test {
protected:
    void dmi(const std::string& file, const std::string& text) {
        recorded_.file("/sys/class/dmi/id/" + file, text);
    }
    void flags(const std::string& flags) {
        recorded_.file("/proc/cpuinfo", "processor\t: 0\nflags\t\t: " + flags);
    }
    std::string fact(const std::string& property, bool privileged = true) const {
        return told(recorded_.host(privileged), Class::system, "", property);
    }
    RecordedHost recorded_;
};

TEST_F(System, OfAnEmptyHostNothingIsMadeUp) {
    EXPECT_EQ(told(recorded_.host(), Class::system), "");
}

TEST_F(System, WordsThatStandForNothingAreNotTold) {
    for (const char* word :
         {"To Be Filled By O.E.M.", "Default string", "System Product Name", "None", " "}) {
        dmi("product_name", word);
        EXPECT_EQ(fact("Model"), "") << word;
    }
    recorded_.file("/proc/device-tree/model", "Board");
    EXPECT_EQ(fact("Model"), "Board");
}

TEST_F(System, NumbersThatNobodyFilledInAreNotTold) {
    for (const char* number : {"00000000-0000-0000-0000-000000000000", "ffffffff-ffff-ffff-ffff-ffffffffffff",
                               "FFFFFFFF-FFFF-FFFF-FFFF-FFFFFFFFFFFF"}) {
        dmi("product_uuid", number);
        EXPECT_EQ(fact("UUID"), "") << number;
    }
    dmi("product_uuid", "0f000000-0000-0000-0000-000000000000");
    EXPECT_NE(fact("UUID"), "");
}

TEST_F(System, SerialNumbersAreForTrustedOnes) {
    dmi("product_serial", "S1");
    dmi("product_uuid", "4c4c4544-0000-1010-8000-b0c04f000001");
    EXPECT_EQ(fact("SerialNumber"), "S1");
    EXPECT_EQ(fact("SerialNumber", false), "");
    EXPECT_EQ(fact("UUID", false), "");
}

TEST_F(System, TheProcessorTellsOfAVirtualMachine) {
    EXPECT_EQ(fact("Virtual"), "");
    flags("fpu hypervisors");
    EXPECT_EQ(fact("Virtual"), "false");
    flags("fpu hypervisor");
    EXPECT_EQ(fact("Virtual"), "true");
    EXPECT_EQ(fact("VirtualKind"), "");
}

TEST_F(System, MachinesThatACloudGivesOutWholeAreNotVirtual) {
    dmi("sys_vendor", "Amazon EC2");
    flags("fpu");
    EXPECT_EQ(fact("Virtual"), "false");
    EXPECT_EQ(fact("VirtualKind"), "");
    flags("fpu hypervisor");
    EXPECT_EQ(fact("VirtualKind"), "KVM");
}

TEST_F(System, AVirtualMachineWhoseProcessorDeniesItIsOne) {
    dmi("product_name", "VirtualBox");
    flags("fpu");
    EXPECT_EQ(fact("Virtual"), "true");
    EXPECT_EQ(fact("VirtualKind"), "VirtualBox");
}

TEST_F(System, OfXenOnlyGuestsAreVirtual) {
    recorded_.file("/sys/hypervisor/type", "xen");
    recorded_.file("/proc/xen/capabilities", "");
    EXPECT_EQ(fact("VirtualKind"), "Xen");
    recorded_.file("/proc/xen/capabilities", "control_d");
    EXPECT_EQ(fact("VirtualKind"), "");
    EXPECT_EQ(fact("Virtual"), "");
}

TEST_F(System, TheDistributionNamesItself) {
    const auto name = [this](const std::string& text) {
        recorded_.file("/etc/os-release", text);
        return fact("Distribution");
    };
    EXPECT_EQ(name("NAME=x\nPRETTY_NAME=\"A \\\"B\\\" 1\""), "A \"B\" 1");
    EXPECT_EQ(name("PRETTY_NAME='One'"), "One");
    EXPECT_EQ(name("PRETTY_NAME=Bare\\"), "Bare\\");
    EXPECT_EQ(name("PRETTY_NAME=\"\x1b[2J\""), "?[2J");
    EXPECT_EQ(name("XPRETTY_NAME=\"No\""), "");
    recorded_.remove("/etc/os-release");
    recorded_.file("/usr/lib/os-release", "PRETTY_NAME=\"Two\"");
    EXPECT_EQ(fact("Distribution"), "Two");
}

TEST_F(System, TheBootTimeIsTheKernels) {
    recorded_.file("/proc/stat", "cpu 1\nbtimes 3\nbtime 1700000000\nprocesses 9");
    EXPECT_EQ(fact("BootTime"), "1700000000");
    recorded_.file("/proc/stat", "btime soon");
    EXPECT_EQ(fact("BootTime"), "");
}

}  // namespace
