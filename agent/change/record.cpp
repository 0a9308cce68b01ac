#include "agent/change/record.h"

#include "agent/core/command_deadline.h"

namespace cvagent::change {

Record& Record::only() {
    static Record record;
    return record;
}

void Record::begin(std::size_t change) {
    const std::lock_guard lock(guard_);
    change_ = change;
}

void Record::command(const std::string& text, bool recorded) {
    if (CommandScope::isWriting()) {
        const std::lock_guard lock(guard_);
        commands_.push_back({text, recorded, change_});
    }
}

std::vector<PlannedCommand> Record::commands() const {
    const std::lock_guard lock(guard_);
    return commands_;
}

}  // namespace cvagent::change
