#include "agent/core/reading.h"

#include <unistd.h>

#include <exception>
#include <utility>

#include "agent/core/command_deadline.h"
#include "agent/core/oshw/start_facts.h"

namespace cvagent {

std::string errorText(const IC::Error& error) {
    return error.text().empty() ? "status " + std::to_string(error.getStatus()) : error.text();
}

Reading readProperty(const IC::MutableNode& node, unsigned int id, Source source) {
    Reading reading{id, findProperty(node.nodeType(), id), {}, {}};
    const CommandScope scope(CommandScope::read);
    try {
        const auto told = source == Source::host ? oshw::askStartFact(node, id) : std::nullopt;
        if (told) {
            reading.value = *told;
        }
        const IC::Error result = told ? IC::Error() : node.getProperty(id, reading.value);
        if (result.getStatus() != 0) {
            reading.error = errorText(result);
            reading.missing = result.code() == IC::Number(IC::Error::kNoSuchProperty);
            reading.timedOut = result.getStatus() == IC::Error::unanswered;
            reading.value = {};
        }
    } catch (const std::exception& exception) {
        reading.error = std::string("the plug-in threw: ") + exception.what();
    } catch (...) {
        reading.error = "the plug-in threw an unknown exception";
    }
    // Whatever the plug-in made of a command that was cut off, it is not what the host says.
    if (std::string complaint = scope.complaint(); !complaint.empty()) {
        reading.value = {};
        reading.error = std::move(complaint);
        reading.missing = false;
        reading.timedOut = true;
    }
    return reading;
}

std::string Reading::complaint() const {
    if (missing && row != nullptr) {
        return row->trusted && geteuid() != 0 ? "told to root only" : "not known";
    }
    return "not known (" + error + ")";
}

std::vector<Reading> storedReadings(const IC::MutableNode& node) {
    std::vector<Reading> readings;
    for (const auto& [id, value] : storedProperties(node)) {
        readings.push_back({id, findProperty(node.nodeType(), id), value, {}});
    }
    return readings;
}

}  // namespace cvagent
