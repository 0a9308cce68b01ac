// The smallest front end: it prints the paths of all nodes, or one property of one node. All it needs is the
// agent's library.
#include <cstdio>

#include "agent/core/process.h"
#include "agent/core/property_words.h"

namespace {

void printAll(const cvagent::Agent& agent) {
    for (const cvagent::NodeRef& node : agent.nodes()) {
        std::printf("%s\n", node->getPath().c_str());
    }
}

void printOne(const cvagent::Agent& agent, const char* name, const char* property) {
    const cvagent::NodeRef node = agent.find(name);
    const auto ids = cvagent::readableIds(*node, {property});
    const auto reading = agent.read(node, ids, cvagent::Freshness::now, cvagent::Request("tiny")).front();
    std::printf("%s\n", reading.failed() ? "?" : static_cast<std::string>(reading.value).c_str());
}

}  // namespace

int main(int count, char** words) {
    try {
        std::string plugin = words[1];
        cvagent::ProcessSettings wanted;
        wanted.files = {&plugin};
        const cvagent::PreparedProcess process(wanted);
        cvagent::AgentSettings settings = process.agentSettings();
        settings.plugins = {plugin};
        const cvagent::Agent agent(settings);
        count < 4 ? printAll(agent) : printOne(agent, words[2], words[3]);
        return 0;
    } catch (const cvagent::Problem& problem) {
        std::printf("kind %d: %s\n", problem.kind(), problem.what());
        return 10 + problem.kind();
    }
}
