#pragma once

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

}  // namespace cvagent::service
