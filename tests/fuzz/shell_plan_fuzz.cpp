// Reading a command line: whatever it is, it is a plan or for a shell.
#include <cstdint>
#include <cstdio>
#include <cstdlib>

#include "agent/shell/plan.h"

namespace {

void check(bool holds) {
    if (!holds) {
        std::fprintf(stderr, "not a plan that can be run\n");
        abort();
    }
}

void checkPipeline(const cvagent::shell::Pipeline& pipeline) {
    check(!pipeline.stages.empty());
    for (const auto& stage : pipeline.stages) {
        check(!stage.words.empty() && !stage.words.front().text.empty());
        check(!stage.output || (&stage == &pipeline.stages.back() && stage.output->path.front() == '/'));
        for (const auto& word : stage.words) {
            check(word.inserted == nullptr || &stage == &pipeline.stages.front());
            if (word.inserted != nullptr) {
                checkPipeline(*word.inserted);
            }
        }
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string text(reinterpret_cast<const char*>(data), size);
    if (const auto plan = cvagent::shell::readPlan(text)) {
        check(!plan->empty());
        for (const auto& pipeline : *plan) {
            checkPipeline(pipeline);
            // A pipeline by itself reads as it did among the others.
            const auto alone = cvagent::shell::readPlan(pipeline.text);
            check(alone && alone->size() == 1 && alone->front().stages.size() == pipeline.stages.size());
        }
    }
    return 0;
}
