// What a plan foretells against what the same change then does: files byte for byte, commands text for text,
// the kernel's state in the end.
#include <gmock/gmock.h>

#include <algorithm>
#include <memory>
#include <mutex>
#include <optional>
#include <sstream>
#include <thread>

#include "agent/change/in_force.h"
#include "agent/change/kernel_state.h"
#include "agent/core/agent.h"
#include "agent/core/command_deadline.h"
#include "agent/core/host_tools.h"
#include "agent/core/property_words.h"
#include "agent/shell/runner.h"
#include "tests/change/rehearsed.h"

namespace {

using cvagent::Agent;
using cvagent::HostTools;
using cvagent::NodeRef;
using cvagent::NodeType;
using cvagent::change::Change;
using cvagent::change::Plan;
using Texts = std::vector<std::string>;

std::mutex guard;
Texts* heard = nullptr;  // guarded by guard

void hear(const char* command) {
    const std::lock_guard lock(guard);
    if (heard != nullptr && cvagent::CommandScope::isWriting()) {
        heard->emplace_back(command);
    }
}

/// Values for each property that can be written; those of one node follow each other as a person would.
struct Value {
    NodeType type;
    unsigned int property;
    Texts words;
};
const Value kValues[] = {
    {NodeType::computer, 115, {"Ada Lovelace, room 7"}},
    {NodeType::computer, 116, {"Grace"}},
    {NodeType::computer, 123, {"9"}},
    {NodeType::computer, 126, {"2026-11-20T21:03:00Z"}},
    {NodeType::computer, 127, {"60"}},
    {NodeType::ipConfig, 24, {"3"}},
    {NodeType::ipConfig, 25, {"192.0.2.99"}},
    {NodeType::ipConfig, 26, {"255.255.255.128"}},
    {NodeType::ipConfig, 27, {"2001:db8::99"}},
    {NodeType::ipConfig, 102, {"56"}},
    {NodeType::ipConfig, 94, {"192.0.2.53", "2001:db8::53"}},
    {NodeType::ipConfig, 97, {"newname"}},
    {NodeType::ipConfig, 98, {"example.org"}},
    {NodeType::ipConfig, 99, {"example.org", "example.net"}},
    {NodeType::ipConfig, 100, {"192.0.2.126"}},
    {NodeType::ipConfig, 101, {"2001:db8::1"}},
    {NodeType::ipConfig, 123, {"12"}},
    {NodeType::ipConfig, 123, {"1"}},
    {NodeType::ipConfig, 24, {"1"}},
    {NodeType::ipConfig, 74, {"1"}},
};

/// An agent of the test's own process, whose writes reach the fake host.
class Deed {
public:
    explicit Deed(HostTools tools) {
        if (tools != HostTools::native) {
            cvagent::putAdaptersOnPath(
                cvagent::inspectHostTools(tools, cvagent::Look::adapters, cvagent::adapterDirectory()));
        }
        cvagent::shell::hearCommands(hear);
        cvagent::AgentSettings settings;
        settings.plugins = {CORVISTA_PLUGIN_FILE};
        settings.bringIntoForce = cvagent::change::bringingIntoForce();
        settings.data = std::make_shared<cvagent::DataDirectory>();
        agent_.emplace(settings);
    }

    std::vector<Change> changes(std::size_t most) const {
        std::vector<Change> all;
        std::size_t configs = 0;
        for (const NodeRef& node : agent_->nodes()) {
            if (NodeType{node->nodeType()} == NodeType::ipConfig && ++configs > most) {
                continue;
            }
            for (const Value& value : kValues) {
                if (value.type == NodeType{node->nodeType()}) {
                    all.push_back({node->getPath(), value.property, value.words});
                }
            }
        }
        return all;
    }

    /// @return the commands of the write
    Texts make(const Change& change) {
        Texts commands;
        setHeard(&commands);
        const NodeRef node = agent_->find(change.node);
        const auto& row = cvagent::writableRow(*node, std::to_string(change.property));
        agent_->write(node, row, cvagent::acceptedValue(row, change.words), cvagent::Request("test"));
        setHeard(nullptr);
        return commands;
    }

private:
    static void setHeard(Texts* where) {
        const std::lock_guard lock(guard);
        heard = where;
    }

    cvagent::QuietCommands quiet_;
    std::optional<Agent> agent_;
};

bool isClock(const std::string& command) {
    return command.starts_with("settimeofday");
}

Texts commandsOf(const Plan& plan, std::size_t change) {
    Texts texts;
    for (const auto& command : plan.commands) {
        if (command.change == change && !isClock(command.text)) {
            texts.push_back(command.text);
        }
    }
    return texts;
}

void expectFiles(const Plan& plan, const std::map<std::string, std::string>& before, const FakeHost& host) {
    std::map<std::string, std::string> foretold = before;
    for (const auto& file : plan.files) {
        foretold.erase(file.path);
    }
    foretold.merge(filesAfter(plan));
    EXPECT_EQ(foretold, writtenPart(host));
}

/// The kernel looks for a moment whether another host has a new IPv6 address; a command can have that word in
/// it.
std::string withoutTime(std::string commands) {
    const std::string word = " tentative";
    for (std::size_t at = commands.find(word); at != std::string::npos; at = commands.find(word)) {
        commands.erase(at, word.size());
    }
    return commands;
}

/// One plan of all changes, then each of them made.
void comparePlanAndDeed(FakeHost& host, Deed& deed, HostTools tools, const std::vector<Change>& changes) {
    const auto before = writtenPart(host);
    const auto kernelBefore = cvagent::change::readKernelState();
    const Plan plan = rehearsed(changes, CORVISTA_PLUGIN_FILE, tools);
    EXPECT_EQ(writtenPart(host), before) << "a plan has changed files";
    EXPECT_EQ(cvagent::change::readKernelState(), kernelBefore) << "a plan has changed the kernel's state";
    EXPECT_TRUE(host.clockCalls().empty());
    EXPECT_EQ(joinedLines(plan.kernelBefore), joinedLines(kernelBefore));
    for (std::size_t at = 0; at < changes.size(); ++at) {
        const Texts done = deed.make(changes[at]);
        EXPECT_EQ(withoutTime(joinedLines(commandsOf(plan, at))), withoutTime(joinedLines(done)))
            << changes[at].node << " " << changes[at].property << ": " << plan.answers[at].problem;
    }
    expectFiles(plan, before, host);
    EXPECT_EQ(joinedLines(plan.kernelAfter), joinedLines(cvagent::change::readKernelState()));
}

/// All changes together, each on what those before it left.
void compareAll(FakeHost& host, HostTools tools, bool hasLinks = true) {
    Deed deed(tools);
    const std::vector<Change> changes = deed.changes(1);
    EXPECT_EQ(changes.size(), hasLinks ? std::size(kValues) : 5U);
    comparePlanAndDeed(host, deed, tools, changes);
}

class RecordedHosts : public testing::TestWithParam<const char*> {};

TEST_P(RecordedHosts, PlansAreDeeds) {
    inFakeHost([](FakeHost& host) {
        host.copyTree(GetParam());
        host.expectUnrecorded();
        moveRecords(host);
        const std::string name = GetParam();
        compareAll(host, name == "todays-names" ? HostTools::automatic : HostTools::native,
                   name != "no-network-tools");
    });
}

INSTANTIATE_TEST_SUITE_P(PlanAndDeed, RecordedHosts,
                         testing::Values("bond-two-members", "bridge-with-members", "containers", "ipv6-only",
                                         "many-interfaces", "no-network-tools", "suse-two-nics",
                                         "todays-names", "vlans", "vmware"));

void bringUpRealLinks(FakeHost& host) {
    host.useKernelNetwork();
    for (const char* tool : {"ip", "hostname"}) {
        host.realTool(tool);
    }
    for (const char* line :
         {"link add eth0 address 02:00:00:00:00:10 type veth peer name sw0", "link set eth0 up",
          "link set sw0 up", "address add 192.0.2.7/24 broadcast + dev eth0",
          "address add 192.0.2.8/24 broadcast + dev eth0 label eth0:1",
          "-6 address add 2001:db8::7/64 dev eth0 nodad", "-6 address replace 2001:db8::7/64 dev eth0",
          "route add default via 192.0.2.1", "route add 10.0.0.0/8 via 192.0.2.2 table 7",
          "rule add from 192.0.2.8 lookup 7", "-6 route add default via 2001:db8::1 dev eth0",
          "link set eth0 mtu 1400"}) {
        Texts words{"ip"};
        std::istringstream split(line);
        for (std::string word; split >> word;) {
            words.push_back(word);
        }
        EXPECT_EQ(host.run(words).status, 0) << line;
    }
    // The kernel gives a link its own address some time after it is up.
    while (std::ranges::count_if(cvagent::change::readKernelState(), [](const std::string& line) {
               return line.find(" fe80::") != line.npos && line.starts_with("address");
           }) < 2) {
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }
    host.file("/etc/sysconfig/network/ifcfg-eth-id-02:00:00:00:00:10",
              "BOOTPROTO='static'\nIPADDR='192.0.2.7'\nNETMASK='255.255.255.0'\n");
    host.file("/etc/sysconfig/network/routes", "default\t192.0.2.1\t-\n");
    host.file("/etc/resolv.conf", "nameserver 192.0.2.53\n");
    host.file("/etc/nsswitch.conf", "hosts: files\n");  // there is no name server
    host.file("/etc/hosts", "127.0.0.1\tlocalhost\n");
}

HOST_TEST(PlanAndDeed, HoldsOnLinksOfARealKernel) {
    bringUpRealLinks(host);
    moveRecords(host);
    EXPECT_THAT(cvagent::change::readKernelState(),
                testing::IsSupersetOf({"address eth0 192.0.2.8/24 label eth0:1",
                                       "link eth0 mtu 1400 up address 02:00:00:00:00:10",
                                       "route 10.0.0.0/8 via 192.0.2.2 dev eth0 table 7",
                                       "route default (IPv6) via 2001:db8::1 dev eth0 table main metric 1024",
                                       "rule 32765: from 192.0.2.8 lookup 7", "host name localhost"}));
    compareAll(host, HostTools::automatic);
}

/// Where root gets no user namespace, the copy of the network is all that the plug-in sees of it.
HOST_TEST(PlanAndDeed, HoldsOnLinksOfARealKernelWithoutAUserNamespace) {
    bringUpRealLinks(host);
    moveRecords(host);
    enterJail(host);
    Deed deed(HostTools::automatic);
    comparePlanAndDeed(host, deed, HostTools::automatic, {{"ip-config:eth0", 25, {"192.0.2.99"}}});
}

/// What reaches the kernel, each on a fresh host: the last of them leaves nothing of the others' doing.
class RealLinks : public testing::TestWithParam<std::size_t> {};

TEST_P(RealLinks, AreForetold) {
    inFakeHost([](FakeHost& host) {
        bringUpRealLinks(host);
        moveRecords(host);
        Deed deed(HostTools::automatic);
        const Value& value = kValues[GetParam()];
        comparePlanAndDeed(host, deed, HostTools::automatic,
                           {{"ip-config:eth0", value.property, value.words}});
    });
}

INSTANTIATE_TEST_SUITE_P(PlanAndDeed, RealLinks, testing::Range(std::size_t{5}, std::size(kValues)));

}  // namespace
