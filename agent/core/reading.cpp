#include "agent/core/reading.h"

#include <algorithm>
#include <atomic>
#include <exception>
#include <system_error>
#include <thread>
#include <utility>

#include "agent/core/command_deadline.h"

namespace cvagent {

namespace {

/// Runs work(0) to work(count - 1) on as many threads as there are processors; the calling thread is one of
/// them.
template <class Work>
void sideBySide(std::size_t count, const Work& work) {
    std::atomic<std::size_t> next{0};
    const auto drain = [&] {
        for (std::size_t i = next++; i < count; i = next++) {
            work(i);
        }
    };
    const std::size_t processors = std::max(1U, std::thread::hardware_concurrency());
    std::vector<std::jthread> helpers;
    try {
        while (helpers.size() + 1 < std::min(processors, count)) {
            helpers.emplace_back(drain);
        }
    } catch (const std::system_error&) {
        // The system gives no more threads: those that run do it all.
    }
    drain();
}

}  // namespace

std::string errorText(const IC::Error& error) {
    return error.text().empty() ? "status " + std::to_string(error.getStatus()) : error.text();
}

Reading readProperty(const IC::MutableNode& node, unsigned int id) {
    Reading reading{id, findProperty(node.nodeType(), id), {}, {}, false};
    const Errand errand(Errand::read);
    try {
        const IC::Error result = node.getProperty(id, reading.value);
        if (result.getStatus() != 0) {
            reading.error = errorText(result);
            reading.missing = result.text() == "no such property: " + std::to_string(id);
        }
    } catch (const std::exception& exception) {
        reading.error = std::string("the plug-in threw: ") + exception.what();
    } catch (...) {
        reading.error = "the plug-in threw an unknown exception";
    }
    // Whatever the plug-in made of a command that was cut off, it is not what the host says.
    if (std::string complaint = errand.complaint(); !complaint.empty()) {
        reading.value = {};
        reading.error = std::move(complaint);
        reading.missing = false;
        reading.timedOut = true;
    }
    return reading;
}

std::vector<Reading> readProperties(const IC::MutableNode& node, const std::vector<unsigned int>& ids) {
    std::vector<Reading> readings(ids.size());
    sideBySide(ids.size(), [&](std::size_t i) { readings[i] = readProperty(node, ids[i]); });
    return readings;
}

std::vector<Reading> storedReadings(const IC::MutableNode& node) {
    std::vector<Reading> readings;
    for (const auto& [id, value] : storedProperties(node)) {
        readings.push_back({id, findProperty(node.nodeType(), id), value, {}, false});
    }
    return readings;
}

}  // namespace cvagent
