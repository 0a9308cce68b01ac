#include "agent/change/attempt.h"

#include <memory>

#include "agent/change/in_force.h"
#include "agent/change/kernel_state.h"
#include "agent/change/record.h"
#include "agent/change/recorders.h"
#include "agent/change/unforeseen.h"
#include "agent/change/written_files.h"
#include "agent/core/process.h"
#include "agent/core/property_words.h"
#include "agent/core/text.h"
#include "agent/shell/runner.h"

namespace cvagent::change {

namespace {

std::string valueText(const Reading& reading) {
    return reading.failed() ? "" : printable(static_cast<std::string>(reading.value));
}

/// Whether an interface is up is looked up in /sys, which is the host's: it shows nothing of the copy's
/// links.
bool isSeenInCopy(const Property& row) {
    constexpr unsigned int kInterfaceState = 123;
    return row.type != NodeType::ipConfig || row.id != kInterfaceState;
}

void makeChange(const Agent& agent, const Change& change, Answer& answer) {
    const NodeRef node = agent.find(change.node);
    answer.node = node->getPath();
    const Property& row = writableRow(*node, std::to_string(change.property));
    answer.property = row.name;
    const IC::PropertyValue value = acceptedValue(row, change.words);
    const Request request("rehearsal");
    const WriteResult result = agent.write(node, row, value, request);
    answer.errors = request.errors().take().texts;
    answer.problem = result.problem ? result.problem->what() : "";
    answer.before = valueText(result.before);
    answer.after = valueText(result.after);
    answer.lacking = isSeenInCopy(row) ? result.lacking : "";
}

Answer tried(const Agent& agent, const Change& change) {
    Answer answer;
    answer.node = change.node;
    answer.property = std::to_string(change.property);
    try {
        makeChange(agent, change, answer);
    } catch (const Problem& problem) {
        answer.problem = problem.what();
    }
    return answer;
}

void hear(const char* command) {
    Record::only().command(command, isRecorded(command));
}

}  // namespace

Plan attempt(const RehearsalRequest& request, const Isolation& isolation) {
    std::vector<std::string> plugins = request.plugins;
    ProcessSettings wanted;
    for (std::string& plugin : plugins) {
        wanted.files.push_back(&plugin);
    }
    wanted.hostTools = request.hostTools;
    wanted.commands = request.commands;
    const PreparedProcess process(wanted);
    putRecordersOnPath(isolation.fence == Fence::droppedRights);
    shell::hearCommands(hear);
    AgentSettings settings = process.agentSettings();
    settings.plugins = plugins;
    settings.bringIntoForce = bringingIntoForce(Neighbours::notAsked);
    // Its end would wait for monitors and take the nodes away, one by one; the process just ends.
    const Agent& agent = *std::make_unique<Agent>(settings).release();
    // The threads that write are made later and inherit it.
    if (isolation.fence == Fence::userNamespace) {
        enterNetwork(isolation.network);
    }
    Plan plan;
    plan.changes = request.changes;
    const WrittenFiles before = writtenFiles(isolation.covers);
    plan.kernelBefore = readKernelState();
    for (const Change& change : request.changes) {
        Record::only().begin(plan.answers.size());
        plan.answers.push_back(tried(agent, change));
    }
    plan.kernelAfter = readKernelState();
    plan.files =
        changesBetween(before, writtenFiles(isolation.covers), isolation.covers, isolation.dataDirectory);
    plan.commands = Record::only().commands();
    plan.unforeseen = unforeseen(plan, isolation);
    return plan;
}

}  // namespace cvagent::change
