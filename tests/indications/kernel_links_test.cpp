// The whole plug-in on links of a real kernel whose carrier comes and goes.
#include <gmock/gmock.h>

#include <algorithm>

#include "framework/qx/thread.h"
#include "oshwmi/os_hw_mi.h"
#include "tests/indications/heard.h"
#include "tests/support/fake_host.h"
#include "tests/support/texts_are.h"
#include "tests/support/waiting.h"
#include "tests/support/waits.h"

namespace {

constexpr char kFile[] = "/opt/vantrel/corvista/data/oshwminetind.dat";

/// Two ports of this host, each wired to an end that a test pulls and plugs.
class Wired {
public:
    explicit Wired(FakeHost& host) : host_(host) {
        for (const char* tool : {"ip", "ethtool", "brctl"}) {
            host.realTool(tool);
        }
        host.useKernelNetwork();
        host.directory("/opt/vantrel/corvista/data");
        for (const std::string tool : {"ifconfig", "route"}) {
            host.tool(tool + " %any",
                      {.out = "",
                       .action = buildDirectory() + "/hosttools/corvista-hosttools " + tool + " \"$@\""});
        }
        // The far ends have names that the listing of the interfaces passes over.
        for (const std::string number : {"0", "1"}) {
            ip("link add eth" + number + " type veth peer name far" + number);
            ip("link set eth" + number + " up");
            ip("link set far" + number + " up");
        }
    }
    Wired(const Wired&) = delete;
    Wired& operator=(const Wired&) = delete;

    void pull(const std::string& number) { ip("link set far" + number + " down"); }
    void plug(const std::string& number) { ip("link set far" + number + " up"); }
    void start() {
        QX::setClockSpeed(300);  // 30 seconds pass in 100 ms
        IC::myoshwmi.registerForAlerts(Heard::hear, &heard_);
        IC::myoshwmi.initialize(1, IC::Number(1U), IC::Number(2U));
    }
    void stop() { IC::myoshwmi.unload(); }
    bool kept(const std::string& states) const {
        return eventually([&] { return host_.read(kFile) == states; });
    }
    /// What was heard when some more passes have gone by.
    std::vector<std::string> heard() {
        const auto passes = [this] {
            const auto waits = waits_.others();
            return std::count(waits.begin(), waits.end(), 30);
        };
        EXPECT_TRUE(eventually([&, before = passes()] { return passes() >= before + 2; }));
        return heard_.now();
    }

private:
    void ip(const std::string& words) const {
        const Finished done = host_.run({"sh", "-c", "ip " + words});
        ASSERT_EQ(done.status, 0) << words << ": " << done.err;
    }

    FakeHost& host_;
    Waits waits_;
    Heard heard_;
};

HOST_TEST(KernelLinks, RaiseEachCarrierChangeOnceAndAcrossARestart) {
    host.expectUnrecorded();
    Wired links(host);
    links.start();
    ASSERT_TRUE(links.kept("eth0=1\neth1=1\n")) << *host.read(kFile);
    links.pull("0");
    ASSERT_TRUE(links.kept("eth0=12\neth1=1\n"));
    EXPECT_THAT(links.heard(), TextsAre("NIC is Offline "));
    links.plug("0");
    ASSERT_TRUE(links.kept("eth0=1\neth1=1\n"));
    EXPECT_THAT(links.heard(), TextsAre("NIC is Offline ", "NIC is Online "));
    links.stop();
    links.pull("1");
    links.start();
    ASSERT_TRUE(links.kept("eth0=1\neth1=12\n"));
    EXPECT_THAT(links.heard(), TextsAre("NIC is Offline ", "NIC is Online ", "NIC is Offline "));
    links.stop();
}

}  // namespace
