// The network monitor's pass over the plug-in's own nodes, on a recorded host with a bond whose members'
// cables are pulled and plugged.
#include <gmock/gmock.h>

#include "indications/globals.h"
#include "tests/indications/heard.h"
#include "tests/network/port_host.h"
#include "tests/support/texts_are.h"

namespace {

using testing::IsEmpty;

constexpr char kFile[] = "/opt/vantrel/corvista/data/oshwminetind.dat";

/// A bond of eth0 and eth1, both plugged, that was looked at once.
class BondHost {
public:
    explicit BondHost(FakeHost& host) : host_(host), plugin_(host, "bond-two-members") {
        plugin_.build();
        plugin_.mi().registerForAlerts(Heard::hear, &heard_);
        EXPECT_THAT(told(), IsEmpty());
        EXPECT_EQ(host.read(kFile), "bond0=1\neth0=1\neth1=1\n");
    }

    void link(const std::string& port, const char* detected) {
        host_.tool("ethtool " + port, std::string("\tLink detected: ") + detected + '\n');
    }
    /// What the agent is told by the next pass.
    std::vector<std::string> told() {
        heard_.messages.clear();
        plugin_.mi().readPrevNetNodeMap();
        plugin_.mi().createCurNetNodeMap();
        plugin_.mi().checkAndSendNetAlert();
        plugin_.mi().writePrevNetNodeMap();
        return heard_.now();
    }
    IC::MutableNode& bond() { return *plugin_.config("bond0"); }

private:
    FakeHost& host_;
    PortHost plugin_;
    Heard heard_;
};

HOST_TEST(RecordedBond, TellsOfItsOwnFailOverAndNothingOfItsMembers) {
    BondHost links(host);
    links.bond().setStatus(12);
    links.link("eth0", "no");
    EXPECT_THAT(links.told(), TextsAre("NIC has Switched Over "));
    EXPECT_EQ(host.read(kFile), "bond0=32\neth0=12\neth1=1\n");
    EXPECT_EQ(links.bond().getStatus(), 1U);
    EXPECT_EQ(PortHost::stored(links.bond(), 123), number(32));
    EXPECT_EQ(PortHost::live(links.bond(), 123), number(1)) << "that is for the host to say";
    EXPECT_THAT(links.told(), TextsAre("NIC is Online ")) << "the bond itself was up all the time";
    EXPECT_THAT(links.told(), IsEmpty());
    links.link("eth0", "yes");
    EXPECT_THAT(links.told(), TextsAre("NIC has Switched Back "));
    EXPECT_EQ(host.read(kFile), "bond0=33\neth0=1\neth1=1\n");
    for (const std::string& call : host.callsOf("ifconfig")) {
        EXPECT_TRUE(call == "ifconfig" || call == "ifconfig bond0")
            << "nothing is taken up or down: " << call;
    }
}

}  // namespace
