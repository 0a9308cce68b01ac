// What the computer node holds when start-up has made it.
#include <gmock/gmock.h>

#include <cstdlib>

#include "computer/computer_node.h"
#include "mi/globals.h"
#include "oshwmi/os_hw_mi.h"
#include "tests/computer/computer_host.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/texts_are.h"

namespace {

using IC::Number;
using IC::PropertyValue;

/// The tree down to the computer.
class Started {
public:
    Started() {
        mi_.createOsHwNodes();
        mi_.createRootNode();
        capture_.clear();
        mi_.createComputerNodes();
        std::vector<IC::Node*> nodes;
        mi_.getMap(nodes);
        computer_ = dynamic_cast<IC::ComputerNode*>(nodes.back());
    }
    const IC::ComputerNode& computer() const { return *computer_; }
    /// What the framework keeps; an empty value of kind none when it keeps nothing.
    PropertyValue stored(unsigned int id) const {
        PropertyValue value;
        computer_->IC::MutableNode::getProperty(id, value);
        return value;
    }
    const LogCapture& log() const { return capture_; }

private:
    LogCapture capture_;
    IC::OsHwMI mi_;
    IC::ComputerNode* computer_ = nullptr;
};

PropertyValue known(const std::string& text) {
    return {text, true};
}

HOST_TEST(ComputerStart, FillsTheStore) {
    setenv("TZ", "XXX-5:30", 1);
    host.file(kAssetFile, "Computer.OwnerContact=roe@example.org\nComputer.OwnerName=Jane Roe\n");
    host.tool("hostname", "alpha.example.org\n");
    const long before = time(nullptr);
    const Started started;
    EXPECT_EQ(started.stored(123), PropertyValue(IC::EnumValue(1), true));
    EXPECT_EQ(started.stored(125), PropertyValue(std::vector<Number>{1U, 9U, 12U}, true));
    EXPECT_EQ(started.stored(116), known("Jane Roe"));
    EXPECT_EQ(started.stored(115), known("roe@example.org"));
    EXPECT_GE(std::stol(static_cast<std::string>(started.stored(126))), before);
    EXPECT_EQ(started.stored(127), PropertyValue(Number(330.0), true));
    EXPECT_EQ(started.stored(108), known("alpha.example.org"));
    EXPECT_TRUE(started.stored(108).known());
    EXPECT_EQ(started.stored(200).kind(), PropertyValue::none);
    EXPECT_THAT(host.calls(), TextsAre("hostname"));
}

HOST_TEST(ComputerStart, GivesStatusAndDescription) {
    host.tool("hostname", "alpha\n");
    const Started started;
    EXPECT_EQ(started.computer().getStatus(), 1U);
    EXPECT_EQ(started.computer().getDescription(), "Computer");
    EXPECT_EQ(started.computer().nodeType(), 40U);
    EXPECT_EQ(started.computer().getIndex(), 0U);
}

/// The lines of the log without the part they share.
std::vector<std::string> begun(const LogCapture& capture) {
    std::vector<std::string> found;
    for (const std::string& message : capture.messages(3000)) {
        if (message.ends_with("Property: entry")) {
            found.push_back(message.substr(14, 3));
        }
    }
    return found;
}

HOST_TEST(ComputerStart, GoesThroughTheNodesOwnReadsAndWritesInOrder) {
    host.file(kAssetFile, "");
    host.tool("hostname", "alpha\n");
    const Started started;
    EXPECT_THAT(begun(started.log()),
                TextsAre("set", "set", "get", "set", "get", "set", "get", "set", "get", "set", "set"));
    EXPECT_EQ(started.log().messages().front(), "createComputerNodes: entry");
    EXPECT_EQ(started.log().messages().back(), "createComputerNodes: exit");
}

HOST_TEST(ComputerStart, TakesEmptyTextsForAnOwnerNobodyNoted) {
    host.tool("hostname", "alpha\n");
    const Started started;
    EXPECT_EQ(started.stored(115), known(""));
    EXPECT_EQ(started.stored(116), known(""));
    EXPECT_FALSE(host.exists(kAssetFile));
}

HOST_TEST(ComputerStart, TakesTheNameThatHostnamePrints) {
    const std::pair<std::string, std::string> printed[] = {
        {"alpha\n", "alpha"},
        {"alpha", "alpha"},
        {"alpha\nsecond line\n", "alpha"},
        {" alpha \n", " alpha "},
        {"unknown\n", "unknown"},
        {"\n", ""},
        {std::string(600, 'n') + "\n", std::string(511, 'n')},
    };
    for (const auto& [output, name] : printed) {
        host.tool("hostname", output);
        EXPECT_EQ(Started().stored(108), known(name));
    }
}

HOST_TEST(ComputerStart, LeavesTheNameUnsetWhenHostnameCannotTell) {
    for (const char* output : {"", "Unknown\n", "hostname: Unknown host\n"}) {
        host.tool("hostname", output);
        EXPECT_EQ(Started().stored(108).kind(), PropertyValue::none) << output;
    }
    host.toolMissing("hostname");
    const Started started;
    EXPECT_EQ(started.stored(108).kind(), PropertyValue::none);
    EXPECT_EQ(started.computer().getDescription(), "Computer");
}

HOST_TEST(ComputerStart, ChangesNothingOnTheHostAlsoTheSecondTime) {
    setenv("TZ", "XXX-5:30", 1);
    host.file(kAssetFile, "Computer.OwnerContact=a\nOther=b\n");
    host.file("/etc/sysconfig/clock", "TIMEZONE=\"old\"\n");
    host.tool("hostname %any", "alpha\n");
    host.expectUnrecorded();  // what the network's builders ask is not of interest here
    const LogCapture quiet;
    for (int start = 0; start < 2; ++start) {
        EXPECT_EQ(IC::myoshwmi.initialize(1, Number(1U), Number(2U)).getStatus(), 0);
        EXPECT_TRUE(IC::OSHWMI::bInitflag);
        IC::myoshwmi.unload();
    }
    EXPECT_EQ(host.read(kAssetFile), "Computer.OwnerContact=a\nOther=b\n");
    EXPECT_EQ(host.read("/etc/sysconfig/clock"), "TIMEZONE=\"old\"\n");
    EXPECT_FALSE(host.exists("/etc/localtime"));
    EXPECT_TRUE(host.clockCalls().empty());
}

}  // namespace
