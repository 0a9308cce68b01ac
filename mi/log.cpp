#include "mi/log.h"

#include "framework/cvlog/logger.h"

namespace IC {

namespace {

void write(const LogSource& source, int level, const std::source_location& where,
           const std::string& message) {
    const std::string function(bareFunctionName(where.function_name()));
    const int line = static_cast<int>(where.line());
    CVLog::CVLogger::logLevelMessage(function.c_str(), source.name, line, *source.component, level, nullptr,
                                     0, 0, message);
    CVLog::CVLogger::traceLevelMessage(function.c_str(), source.name, line, *source.component, level, nullptr,
                                       0, 0, message);
}

}  // namespace

std::string_view bareFunctionName(std::string_view signature) {
    // A lambda is named after the function it stands in.
    if (const auto lambda = signature.find("::<lambda"); lambda != signature.npos) {
        signature = signature.substr(0, lambda);
    }
    signature = signature.substr(0, signature.find('('));
    if (const auto start = signature.find_last_of(": *&"); start != signature.npos) {
        signature.remove_prefix(start + 1);
    }
    return signature;
}

LogLine::~LogLine() {
    try {
        write(source_, level_, where_, buffer_.str());
    } catch (...) {
        // No memory for a log line: the work itself goes on.
    }
}

LogScope::LogScope(std::string name, const LogSource& source, const std::source_location& where)
    : name_(name.empty() ? std::string(bareFunctionName(where.function_name())) : std::move(name)),
      source_(source),
      where_(where) {
    LogLine(source_, kProgress, where_) << name_ << ": entry";
}

LogScope::~LogScope() {
    LogLine(source_, kProgress, where_) << name_ << ": exit";
}

}  // namespace IC
