#include "agent/log_output.h"

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

#include "agent/failure.h"
#include "agent/print.h"
#include "agent/surroundings.h"
#include "agent/want.h"
#include "framework/cvlog/logger.h"

namespace cvagent {

namespace {

constexpr std::size_t kMostNames = 1000;  // that are remembered as told
constexpr std::size_t kMostErrors = 50;   // of one call; a plug-in in trouble can report thousands

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
        throw Failure(ExitStatus::failed,
                      "cannot write to '" + printable(file) + "': " + reason + "; name another file or none");
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

/// Writes lines to a descriptor and keeps the errors.
class LogOutput::Sink : public CVLog::LogSink {
public:
    /// @param file none: standard error when `show`, else nowhere
    /// @param advises of lines that were not asked for: a name that is refused is told once, with what to do
    Sink(const std::optional<std::string>& file, bool show, int lowest, bool advises)
        : lowest_(lowest), seen_(show && !file), advises_(advises && !file) {
        if (file) {
            own_ = openLog(*file);
        }
        if (file || show) {
            lines_.emplace(file ? own_ : messageDescriptor());
        }
    }
    Sink(const Sink&) = delete;
    Sink& operator=(const Sink&) = delete;
    ~Sink() override {
        if (own_ >= 0) {
            close(own_);
        }
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

    std::vector<std::string> takeErrors() {
        const std::lock_guard lock(guard_);
        std::vector<std::string> texts;
        for (const auto& [text, count] : errors_) {
            texts.push_back(count == 1 ? text : text + " (" + std::to_string(count) + " times)");
        }
        if (lost_ > 0) {
            texts.push_back("and " + std::to_string(lost_) + " more; --log FILE keeps them all");
        }
        errors_.clear();
        lost_ = 0;
        return texts;
    }

    int threshold() const { return std::min(lowest_, kErrorLevel); }

private:
    /// Hundreds of commands can name one interface: it is told once.
    void advise(const CVLog::LogRecord& record, const std::string& refused) {
        if (!isNew(refused)) {
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
        const std::lock_guard lock(guard_);
        const auto known = std::find_if(errors_.begin(), errors_.end(),
                                        [&text](const auto& error) { return error.first == text; });
        if (known != errors_.end()) {
            ++known->second;
        } else if (errors_.size() < kMostErrors) {
            errors_.emplace_back(text, 1);
        } else {
            ++lost_;
        }
    }

    int lowest_;
    bool seen_;     ///< what lines_ gets, the user sees
    bool advises_;  ///< what lines_ gets, the user has not asked for
    int own_ = -1;
    std::optional<CVLog::DescriptorSink> lines_;
    std::mutex guard_;
    std::vector<std::pair<std::string, std::size_t>> errors_;  // text and how often; guarded by guard_
    std::size_t lost_ = 0;                                     // guarded by guard_
    std::set<std::string> told_;                               // refused names; guarded by guard_
};

LogOutput::LogOutput(const Options& options, bool live)
    : log_(std::make_unique<Sink>(options.logFile, live || options.logLevel,
                                  options.logLevel.value_or(kErrorLevel), live && !options.logLevel)) {
    CVLog::CVLogger::setLog(log_.get(), log_->threshold());
    if (options.traceFile) {
        trace_ = std::make_unique<Sink>(options.traceFile, false, 0, false);
        CVLog::CVLogger::setTrace(trace_.get(), 0);
    }
}

LogOutput::~LogOutput() {
    CVLog::CVLogger::setLog(nullptr, 0);
    CVLog::CVLogger::setTrace(nullptr, 0);
}

std::vector<std::string> LogOutput::takeErrors() {
    return log_->takeErrors();
}

void LogOutput::showErrors() {
    for (const std::string& error : takeErrors()) {
        complain("the plug-in reports: " + error);
    }
}

}  // namespace cvagent
