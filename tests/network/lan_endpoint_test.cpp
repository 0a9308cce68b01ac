#include "network/lan_endpoint_node.h"

#include <gmock/gmock.h>

#include "tests/network/port_host.h"
#include "tests/support/log_capture.h"

namespace {

using testing::Contains;
using testing::ElementsAre;

HOST_TEST(LanEndPoint, IsBuiltForEachInterfaceWithAddresses) {
    PortHost plugin(host, "no-network-tools");
    host.useKernelNetwork();
    LogCapture capture;
    plugin.mi().createLANEndPointNodes();
    const auto endPoint = plugin.node(73, "lo");
    ASSERT_NE(endPoint, nullptr);
    EXPECT_EQ(endPoint->getDescription(), "LAN EndPoint node");
    EXPECT_EQ(endPoint->getStatus(), 1U);
    EXPECT_EQ(endPoint->getLinkedId(), plugin.controller());
    const auto config = plugin.config("lo");
    ASSERT_NE(config, nullptr);
    EXPECT_EQ(config->getLinkedId(), endPoint->getNodeId());
    EXPECT_EQ(PortHost::stored(*config, 25), text("127.0.0.1"));
    EXPECT_EQ(PortHost::stored(*config, 26), text("255.0.0.0"));
    EXPECT_EQ(capture.ownMessages().front(), "In OsHwMI::createLANEndPointNodes");
    EXPECT_EQ(capture.ownMessages().back(), "Exit OsHwMI::createLANEndPointNodes");
    EXPECT_THAT(capture.ownMessages(), Contains("OsHwMI::createLANEndPointNodes, Size is: 1"));
}

HOST_TEST(LanEndPoint, PassesEverythingToTheFramework) {
    IC::CLANEndPointNode node(9, 1, {1}, 73, 1, "eth0");
    LogCapture capture;
    EXPECT_EQ(node.setProperty(123, number(12)).getStatus(), 0);
    EXPECT_EQ(PortHost::live(node, 123), number(12));
    EXPECT_THAT(capture.ownMessages(),
                ElementsAre("CLANEndPointNode::setProperty: entry", "CLANEndPointNode::setProperty: exit",
                            "CLANEndPointNode::getProperty: entry", "CLANEndPointNode::getProperty: exit"));
}

TEST(LanEndPoint, FindsThePortANameIsDerivedFrom) {
    unsigned int id = 77;
    EXPECT_FALSE(IC::getParentLANEndPointNode("eth0#1", id)) << "nobody keeps port records";
    CEthernetPort port{"eth0", "", "", 12};
    std::map<std::string, CEthernetPort*> ports = {{"eth0", &port}, {"eth0#1", &port}};
    IC::m_mapEthernetPorts = &ports;
    EXPECT_TRUE(IC::getParentLANEndPointNode("eth0#1", id));
    EXPECT_EQ(id, 12U);
    id = 77;
    EXPECT_TRUE(IC::getParentLANEndPointNode("eth0#1#2", id)) << "cut at the last mark";
    EXPECT_FALSE(IC::getParentLANEndPointNode("eth1#1", id = 77));
    EXPECT_EQ(id, 77U);
    IC::m_mapEthernetPorts = nullptr;
}

}  // namespace
