#include "agent/service/past.h"

#include "agent/core/problem.h"
#include "agent/service/log.h"

namespace cvagent::service {

namespace {

void warn(const std::string& text) {
    log(Priority::warning, text);
}

}  // namespace

Past::Past() : recorder_(std::make_shared<Recorder>(ownHistoryPlace, warn)) {
    try {
        last_ = recorder_->open();
    } catch (const HistoryError& error) {
        warn(std::string("the history cannot be used: ") + error.what());
    }
}

std::vector<Event> Past::read(std::uint64_t after, std::uint64_t upTo, std::size_t most) {
    std::vector<Event> events;
    try {
        HistoryQuery query;
        query.after = after;
        query.upTo = upTo;
        for (HistoryEntry& entry : HistoryReader(ownHistoryPlace()).read(query, most)) {
            events.push_back(std::move(entry.event));
        }
    } catch (const HistoryError& error) {
        if (error.kind() != HistoryError::absent) {
            throw Problem(Problem::failed, std::string("the history cannot be read: ") + error.what());
        }
    }
    return events;
}

void Past::configure(const Config& config) {
    try {
        History(ownHistoryPlace(), warn).setLimits({config.historyAge, config.historyBytes});
    } catch (const HistoryError& error) {
        warn(std::string("the limits of the history stay as they were: ") + error.what());
    }
}

}  // namespace cvagent::service
