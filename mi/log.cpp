#include "mi/log.h"

#include "framework/cvlog/logger.h"
#include "framework/qx/thread.h"

namespace IC {

namespace {

thread_local const char* innermost = nullptr;  // null outside all operations
thread_local bool logEnded = false;

}  // namespace

Operation::Operation(const char* function) : outer_(innermost) {
    innermost = function;
}

Operation::~Operation() {
    innermost = outer_;
}

const char* Operation::nameOr(const char* function) {
    return innermost != nullptr ? innermost : function;
}

void endLogOfThisThread() {
    logEnded = true;
}

LogLine::~LogLine() {
    // What fails in an aborted thread fails because no command is started in it any more.
    if (logEnded || (level_ == kError && QX::Thread::isAborted())) {
        return;
    }
    try {
        const std::string message = buffer_.str();
        CVLog::CVLogger::logLevelMessage(function_, source_.name, line_, *source_.component, level_, nullptr,
                                         0, 0, message);
        CVLog::CVLogger::traceLevelMessage(function_, source_.name, line_, *source_.component, level_,
                                           nullptr, 0, 0, message);
    } catch (...) {
        // No memory for a log line: the work itself goes on.
    }
}

LogScope::LogScope(const char* name, const LogSource& source, const char* function, int line)
    : exit_(name != nullptr ? name : function),
      exitEnd_(": exit"),
      source_(source),
      function_(function),
      line_(line),
      operation_(function) {
    write(exit_, ": entry");
}

LogScope::LogScope(const char* entry, const char* exit, const LogSource& source, const char* function,
                   int line)
    : exit_(exit), exitEnd_(""), source_(source), function_(function), line_(line), operation_(function) {
    write(entry, "");
}

LogScope::LogScope(ClassName owner, const char* function, int line)
    : owner_(owner.text),
      exit_(function),
      exitEnd_(": exit"),
      source_(mainLogSource),
      function_(function),
      line_(line),
      operation_(function) {
    write(exit_, ": entry");
}

LogScope::~LogScope() {
    write(exit_, exitEnd_);
}

void LogScope::write(const char* text, const char* end) const {
    LogLine entry(source_, kProgress, function_, line_);
    if (owner_ != nullptr) {
        entry << owner_ << "::";
    }
    entry << text << end;
}

}  // namespace IC
