// One node for each logical processor the kernel lists, under the planar.
#include <fstream>

#include "cpu/processor_builder.h"
#include "mi/command.h"
#include "mi/log.h"
#include "mi/node_types.h"
#include "mi/text.h"

namespace IC {

std::string loggerOsHwMICpu = "Corvista.IC.MI.OsHwMICpu";

namespace {

const LogSource processorsLogSource{"OsHwMICpu_ix86", &loggerOsHwMICpu};

LogLine logCpu(int level, const char* function = __builtin_FUNCTION(), int line = __builtin_LINE()) {
    return {processorsLogSource, level, Operation::nameOr(function), line};
}

/// Properties of a processor node.
enum ProcessorProperty : unsigned int {
    kClockSpeed = 80,  ///< whole MHz, from the "cpu MHz" line of /proc/cpuinfo
};

constexpr char kListProcessors[] = "cat /proc/cpuinfo 2> /dev/null |grep processor 2> /dev/null ";
constexpr std::size_t kLongestLine = 127;  // the rest of a longer row is judged as a row of its own

/// Whether a row that `grep` found is a processor's: the word also stands in the names of models ("Common KVM
/// processor").
bool isProcessor(const std::string& row) {
    const std::string key = row.substr(0, row.find(':'));
    return key.substr(0, key.find_last_not_of(" \t") + 1) == "processor";
}

/// The k-th speed that the kernel tells is the k-th processor's. One without a speed is left undescribed:
/// agents have always been shown it so.
void describeProcessors(const std::map<unsigned int, std::weak_ptr<MutableNode>>& processors) {
    std::ifstream cpuinfo("/proc/cpuinfo");
    auto processor = processors.begin();
    for (std::string line; processor != processors.end() && std::getline(cpuinfo, line);) {
        if (!contains(line, "cpu MHz")) {
            continue;
        }
        const std::string speed = line.substr(line.find(':') + 1);
        if (const auto node = processor->second.lock()) {  // the agent has not withdrawn it
            node->setDescription("Processor");
            node->setProperty(kClockSpeed,
                              PropertyValue(Number(static_cast<unsigned int>(leadingDecimal(speed))), true));
        }
        ++processor;
    }
}

}  // namespace

void ProcessorBuilder::createCpuNodeAndMap() {
    const LogScope scope("createCpuNodeAndMap", processorsLogSource);
    HostCommand command(kListProcessors);
    if (!command.started()) {
        logCpu(kError) << "createCpuNodeAndMap(): cmd_cpu error";
        return;
    }
    processors_.clear();
    unsigned int number = 1;
    while (const auto line = command.nextLine(kLongestLine)) {
        if (!contains(*line, ":")) {
            logCpu(kError) << "Invalid format: buffer = " << *line;
            continue;
        }
        if (!isProcessor(*line)) {
            continue;
        }
        auto* processor = tree_.makeNode<MutableNode>(tree_.fixed.planar, NodeType::processor, number);
        tree_.appendNode(processor);
        processors_.emplace(number++, processor->weak_from_this());
    }
}

void ProcessorBuilder::createCpuNodes() {
    const LogScope scope("createCpuNodes", processorsLogSource);
    // The agent may call from any thread: a set is built whole, and none while the nodes are taken back.
    const std::lock_guard oneBuildAtATime(tree_.building);
    if (tree_.fixed.planar == nullptr) {
        return;  // called outside initialize and unload: there is no tree to hang them in
    }
    try {
        createCpuNodeAndMap();
        describeProcessors(processors_);
    } catch (const std::exception& failure) {
        logCpu(kError) << "createCpuNodes failed: " << failure.what();
    }
}

}  // namespace IC
