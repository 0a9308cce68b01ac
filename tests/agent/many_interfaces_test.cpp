// A thousand interfaces, from the walk to what the agent prints. The shell is stood in for: seventy commands
// an interface would take minutes, and what they cost is measured elsewhere.
#include <gmock/gmock.h>

#include <algorithm>
#include <nlohmann/json.hpp>
#include <set>

#include "agent/cli/json.h"
#include "agent/core/tree.h"
#include "oshwmi/os_hw_mi.h"
#include "tests/agent/node_list.h"
#include "tests/indications/heard.h"
#include "tests/support/fake_host.h"
#include "tests/support/plugin_access.h"
#include "tests/support/shell_stub.h"

namespace {

using Json = nlohmann::ordered_json;

constexpr unsigned int kInterfaces = 1000;

void addInterfaces(FakeHost& host) {
    std::string listing = "Inter-|   Receive\n face |bytes\n";
    for (unsigned int i = 0; i < kInterfaces; ++i) {
        const std::string name = "eth" + std::to_string(i);
        const std::string link = "/sys/class/net/" + name + "/";
        std::array<char, 24> address{};
        std::snprintf(address.data(), address.size(), "02:00:00:00:%02x:%02x\n", i / 256, i % 256);
        host.file(link + "type", "1\n");
        host.file(link + "flags", "0x1003\n");
        host.file(link + "uevent", "INTERFACE=" + name + "\n");
        host.file(link + "ifindex", std::to_string(i + 2) + "\n");
        host.file(link + "iflink", std::to_string(i + 2) + "\n");
        host.file(link + "addr_assign_type", "0\n");
        host.file(link + "address", address.data());
        host.symlink(link + "device", "../../../0000:00:03.0");
        listing += name + ": 1 0 0 0\n";
    }
    host.file("/proc/net/dev", listing);
}

/// What the commands of the queries print; the listing of the interfaces is really run.
std::optional<std::string> answer(const std::string& command, bool linked) {
    if (command.starts_with("egrep")) {
        return std::nullopt;
    }
    if (command.find("Link detected") != std::string::npos) {
        return linked ? "\tLink detected: yes\n" : "\tLink detected: no\n";
    }
    return command.starts_with("ifconfig -a | grep") ? "eth0 Link encap:Ethernet\n" : "";
}

HOST_TEST(AThousandInterfaces, AreShownFoundAndWatched) {
    addInterfaces(host);
    host.directory("/opt/vantrel/corvista/data");
    host.tool("brctl show", "");
    host.tool("ifconfig", "");
    std::atomic<bool> linked{true};
    shell_stub::answerWith([&linked](const std::string& command) { return answer(command, linked); });
    IC::OsHwMI& mi = IC::myoshwmi;
    mi.ManagementInterface::initialize(1, IC::Number(1U), IC::Number(2U));
    IC::OsHwMITestAccess::makeInventory(mi);
    mi.createOsHwNodes();
    mi.createRootNode();
    mi.createComputerNodes();
    mi.createChassisNodes();
    mi.createPlanarNodes();
    mi.createNetworkControllerNodes();
    mi.createNetworkPortNodes(false);

    cvagent::setPaths(mi);
    const auto nodes = cvagent::NodeRefOfTest::all(mi);
    EXPECT_EQ(cvagent::drawingOrder(nodes).size(), nodes.size());
    std::set<std::string> paths;
    const Json tree = Json::parse(cvagent::json::tree({"plug-in"}, nodes));
    for (const Json& node : tree["nodes"]) {
        paths.insert(node["path"]);
    }
    EXPECT_EQ(paths.size(), 6 + 2 * kInterfaces);
    EXPECT_EQ(cvagent::findNode(mi, "ip-config:eth999")->getPath(),
              "/oshw/root/computer/chassis/network-controller/network-port:eth999/ip-config:eth999");

    Heard heard;
    mi.registerForAlerts(Heard::hear, &heard);
    for (const bool now : {true, true, false, false}) {  // a pass each
        linked = now;
        mi.readPrevNetNodeMap();
        mi.createCurNetNodeMap();
        mi.checkAndSendNetAlert();
        mi.writePrevNetNodeMap();
    }
    EXPECT_EQ(heard.now(), std::vector<std::string>(kInterfaces, "NIC is Offline "));
    mi.unload();
    shell_stub::answerWith({});
}

}  // namespace
