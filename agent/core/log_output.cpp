#include "agent/core/log_output.h"

#include <fcntl.h>
#include <sys/stat.h>
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
#include "agent/core/surroundings.h"
#include "agent/core/text.h"
#include "agent/core/want.h"
#include "framework/cvlog/logger.h"

namespace cvagent {

namespace {

constexpr std::size_t kMostNames = 1000;  // that are remembered as told

std::mutex latestGuard;
const LogOutput* latest = nullptr;  // the one that the logger writes to; guarded by latestGuard

bool isOurs(const struct stat& file) {
    return file.st_uid == geteuid() || file.st_uid == 0;
}

/// Follows a link in the last place, and waits for somebody to read a pipe, only when root or the caller has
/// put it there. A file is refused that others read there, or have under another name.
int openForAppending(const std::string& file) {
    constexpr int kFlags = O_WRONLY | O_APPEND | O_CREAT | O_CLOEXEC | O_NOCTTY;
    int descriptor = open(file.c_str(), kFlags | O_NOFOLLOW | O_NONBLOCK, 0600);
    const bool isItself = descriptor >= 0;
    struct stat found {};
    if (!isItself && (errno == ELOOP || errno == ENXIO) && lstat(file.c_str(), &found) == 0 &&
        isOurs(found)) {
        descriptor = open(file.c_str(), kFlags, 0600);
    }
    if (descriptor < 0 || fstat(descriptor, &found) != 0) {
        return descriptor;
    }
    const bool isFile = S_ISREG(found.st_mode) || (isItself && S_ISFIFO(found.st_mode));
    if (isFile && (!isOurs(found) || found.st_nlink > 1)) {
        close(descriptor);
        errno = EPERM;
        return -1;
    }
    fcntl(descriptor, F_SETFL, O_APPEND);  // writes are waited for
    return descriptor;
}

/// Log files hold the host's settings: only their owner reads them.
int openLog(const std::string& file) {
    const int descriptor = openForAppending(file);
    if (descriptor < 0) {
        const std::string reason = errno == EPERM   ? "it belongs to somebody else or has a second name"
                                   : errno == ELOOP ? "it is a link of somebody else's"
                                                    : std::strerror(errno);
        throw Problem(Problem::failed, "cannot write to '" + printable(file) + "': " + reason,
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

std::string explanation(const std::string& refused) {
    return "no command is run with \"" + printable(refused) +
           "\", for a shell could read more than a name in it, so what it would tell is missing";
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
        seen_ = settings.shown && !settings.file;
        advises_ = settings.advises && !settings.file;
        advice_ = settings.advice;
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
        const std::string text = explanation(refused) + advice_;
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
    std::string advice_;
    std::mutex guard_;
    std::set<std::string> told_;  // refused names; guarded by guard_
};

LogOutput::LogOutput(const LogSettings& settings, std::shared_ptr<ErrorLines> unowned)
    : log_(
          std::make_unique<Sink>(settings.file, settings.shown ? messageDescriptor() : -1, settings.lowest)) {
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
