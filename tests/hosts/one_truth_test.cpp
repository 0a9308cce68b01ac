// What a tree shows of a node and what a read of it gives, on every recorded host.
#include <gmock/gmock.h>

#include <filesystem>

#include "agent/core/agent.h"
#include "agent/core/host_tools.h"
#include "tests/support/fake_host.h"

namespace {

using cvagent::Freshness;
using cvagent::NodeRef;
using cvagent::Reading;

std::vector<std::string> hosts() {
    std::vector<std::string> found;
    for (const auto& entry : std::filesystem::directory_iterator(testsDirectory() + "/hosts")) {
        if (entry.is_directory()) {
            found.push_back(entry.path().filename());
        }
    }
    std::sort(found.begin(), found.end());
    return found;
}

std::string shown(const Reading& reading) {
    return reading.failed() ? "none" : static_cast<std::string>(reading.value);
}

class OneTruth : public testing::TestWithParam<std::string> {};

/// Both say that there is none.
bool isNobodysOwner(const Reading& drawn, const Reading& live) {
    return drawn.name().starts_with("Owner") && shown(drawn).empty() && live.failed();
}

/// The tools of all other hosts find the interfaces; these are read as they were recorded.
void putAdaptersOnPathOf(const std::string& host) {
    using namespace cvagent;
    if (host == "todays-names") {
        putAdaptersOnPath(inspectHostTools(HostTools::automatic, Look::adapters, adapterDirectory()));
    }
}

TEST_P(OneTruth, EachFactOfTheTreeIsTheOneThatAReadGives) {
    inFakeHost([](FakeHost& host) {
        host.copyTree(GetParam());
        host.expectUnrecorded();
        putAdaptersOnPathOf(GetParam());
        cvagent::AgentSettings settings;
        settings.plugins = {CORVISTA_PLUGIN_FILE};
        settings.data = std::make_shared<cvagent::DataDirectory>();
        const cvagent::Agent agent(settings);
        const cvagent::Request request("test");
        const std::vector<NodeRef> nodes = agent.nodes();
        const auto drawn = agent.readTree(nodes, request);
        int compared = 0;
        for (std::size_t i = 0; i < nodes.size(); ++i) {
            for (const Reading& fact : drawn[i]) {
                const Reading live = agent.read(nodes[i], {fact.id}, Freshness::now, request).front();
                ++compared;
                if (!isNobodysOwner(fact, live) && fact.name() != "CurrentTime") {
                    EXPECT_EQ(shown(fact), shown(live)) << nodes[i]->getPath() << " " << fact.name();
                }
            }
        }
        EXPECT_GT(compared, 20);
    });
}

INSTANTIATE_TEST_SUITE_P(Recorded, OneTruth, testing::ValuesIn(hosts()), [](const auto& host) {
    std::string name = host.param;
    std::replace(name.begin(), name.end(), '-', '_');
    return name;
});

}  // namespace
