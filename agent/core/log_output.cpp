#include "agent/core/log_output.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <mutex>
#include <optional>
#include <set>
#include <string_view>
#include <utility>

#include "agent/core/problem.h"
#include "agent/core/text.h"
#include "agent/core/want.h"
#include "framework/cvlog/logger.h"

namespace cvagent {

namespace {

constexpr std::size_t kMostNames = 1000;  // that are remembered as told

std::mutex latestGuard;
const LogOutput* latest = nullptr;  // the one that the logger writes to; guarded by latestGuard

/// Log files hold the host's settings: only their owner reads them.
int openLog(const std::string& file) {
    const int descriptor = open(file.c_str(), O_WRONLY | O_APPEND | O_CREAT | O_CLOEXEC, 0600);
    if (descriptor < 0) {
        throw Problem(Problem::failed, "cannot write to '" + printable(file) + "': " + std::strerror(errno),
                      Problem::logFile);
    }
    return descriptor;
}

/// The text, without control characters, for which the plug-in has refused a command; nothing in other
/// messages.
std::optional<std::string> refusedText(const CVLog::LogRecord& record) {
    constexpr std::string_view kRefusal = "Command refused for its text \"";
    const std::string& message = record.message;
    if (record.level < kErrorLevel || !message.starts_with(kRefusal)) {
        return std::nullopt;
    }
    return message.substr(kRefusal.size(), message.find('"', kRefusal.size()) - kRefusal.size());
}

std::string advice(const std::string& refused) {
    return "no command is run with \"" + printable(refused) +
           "\", for a shell could read more than a name in it, so what it would tell is missing; rename the "
           "interface, bridge, team, disk or host of that name, or correct the file that names it: letters, "
           "digits, dots, dashes and underscores are fine";
}

}  // namespace

/// Writes lines to a descriptor and hands errors to whom they belong.
class LogOutput::Sink : public CVLog::LogSink {
public:
    /// @param descriptor where lines go without a file; -1 for nowhere
    Sink(const std::optional<std::string>& file, int descriptor, int lowest) : lowest_(lowest) {
        if (file) {
            own_ = openLog(*file);
        }
        if (file || descriptor >= 0) {
            lines_.emplace(file ? own_ : descriptor);
        }
    }
    Sink(const Sink&) = delete;
    Sink& operator=(const Sink&) = delete;
    ~Sink() override {
        if (own_ >= 0) {
            close(own_);
        }
    }

    void keepErrors(std::shared_ptr<ErrorLines> unowned, const LogSettings& settings) {
        unowned_ = std::move(unowned);
        seen_ = settings.seen && !settings.file;
        advises_ = settings.advises && !settings.file;
    }

    void write(const CVLog::LogRecord& record) override {
        if (record.level >= kErrorLevel) {
            noteWant(record.message);
        }
        const bool toLines = lines_ && record.level >= lowest_;
        const auto refused = refusedText(record);
        if (toLines && !(refused && advises_)) {
            lines_->write(record);
        }
        if (refused) {
            advise(record, *refused);
        } else if (record.level >= kErrorLevel && !(toLines && seen_)) {
            keep(record.message + " [" + (record.function ? record.function : "?") + "]");
        }
    }

    int threshold() const { return std::min(lowest_, kErrorLevel); }

private:
    /// Hundreds of commands can name one interface: it is told once.
    void advise(const CVLog::LogRecord& record, const std::string& refused) {
        if (!unowned_ || !isNew(refused)) {
            return;
        }
        const std::string text = advice(refused);
        if (lines_ && advises_) {
            lines_->write({record.function, record.source, record.line, record.component, record.level,
                           record.reserved1, record.reserved2, record.reserved3, text});
        } else {
            keep(text);
        }
    }

    bool isNew(const std::string& refused) {
        const std::lock_guard lock(guard_);
        return told_.size() < kMostNames && told_.insert(refused).second;
    }

    void keep(const std::string& text) {
        if (unowned_) {
            ErrorLines* const owner = ErrorScope::owner();
            (owner != nullptr ? *owner : *unowned_).add(text);
        }
    }

    int lowest_;
    int own_ = -1;
    std::optional<CVLog::DescriptorSink> lines_;
    std::shared_ptr<ErrorLines> unowned_;  ///< none: errors are not kept
    bool seen_ = false;                    ///< what lines_ gets, the user sees
    bool advises_ = false;                 ///< what lines_ gets, the user has not asked for
    std::mutex guard_;
    std::set<std::string> told_;  // refused names; guarded by guard_
};

LogOutput::LogOutput(const LogSettings& settings, std::shared_ptr<ErrorLines> unowned)
    : log_(std::make_unique<Sink>(settings.file, settings.descriptor, settings.lowest)) {
    log_->keepErrors(std::move(unowned), settings);
    if (settings.traceFile) {
        trace_ = std::make_unique<Sink>(settings.traceFile, -1, 0);
    }
    const std::lock_guard lock(latestGuard);
    latest = this;
    CVLog::CVLogger::setTrace(trace_.get(), 0);
    CVLog::CVLogger::setLog(log_.get(), log_->threshold());  // nothing can fail any more
}

LogOutput::~LogOutput() {
    const std::lock_guard lock(latestGuard);
    if (latest != this) {
        return;  // another agent's lines go on
    }
    latest = nullptr;
    CVLog::CVLogger::setLog(nullptr, 0);
    CVLog::CVLogger::setTrace(nullptr, 0);
}

}  // namespace cvagent
