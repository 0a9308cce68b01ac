#pragma once

#include <cstdint>
#include <string>
#include <utility>
#include <vector>

namespace cvagent::service {

/// As syslog has them.
enum class Priority { error = 3, warning = 4, notice = 5, info = 6, debug = 7 };
/// Name and value of a field of the journal: "CORVISTA_NODE".
using LogField = std::pair<std::string, std::string>;

/// Has log() send to the journal where standard error is the journal's. To be called before the environment
/// is reduced and before any thread.
void findJournal();
/// One line for whoever looks after the service: into the journal with its fields, else on standard error.
/// Any thread.
void log(Priority priority, const std::string& text, const std::vector<LogField>& fields = {});

/// A write, as the log's fields have it.
struct Deed {
    std::string node;
    std::string property;
    std::uint32_t user = 0;
};
/// What became of it, or was not let become.
void noteWrite(Priority priority, const Deed& deed, const std::string& text, const std::string& verdict);

}  // namespace cvagent::service
