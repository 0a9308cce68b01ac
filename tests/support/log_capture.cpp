#include "tests/support/log_capture.h"

#include <unistd.h>

#include <limits>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <set>
#include <sstream>

using Channel = LogLine::Channel;

class LogCapture::Sink : public CVLog::LogSink {
public:
    Sink(Store& store, Channel channel) : store_(store), channel_(channel) {}
    void write(const CVLog::LogRecord& record) override;

private:
    Store& store_;
    Channel channel_;
};

struct LogCapture::Store {
    mutable std::mutex guard;
    std::vector<LogLine> lines;
    Sink log{*this, Channel::log};
    Sink trace{*this, Channel::trace};
};

namespace {

std::string textOf(const char* text) {
    return text ? text : "(null)";
}

std::string describe(const LogLine& line) {
    std::ostringstream text;
    text << (line.channel == Channel::log ? "log" : "trace") << " of thread " << line.thread << ": "
         << line.level << ' ' << line.component << ' ' << line.source << ':' << line.line << ' '
         << line.function << ": \"" << line.message << '"';
    return text.str();
}

/// The messages that went to the log, of one level or of all.
std::vector<std::string> logged(const std::vector<LogLine>& lines, std::optional<int> level = {}) {
    std::vector<std::string> found;
    for (const LogLine& line : lines) {
        if (line.channel == Channel::log && line.level == level.value_or(line.level)) {
            found.push_back(line.message);
        }
    }
    return found;
}

}  // namespace

bool LogLine::sameArguments(const LogLine& other) const {
    auto arguments = [](const LogLine& of) {
        return std::tie(of.function, of.source, of.line, of.component, of.level, of.reserved1Null,
                        of.reserved2, of.reserved3, of.message);
    };
    return arguments(*this) == arguments(other);
}

void LogCapture::Sink::write(const CVLog::LogRecord& record) {
    LogLine line{channel_,
                 std::this_thread::get_id(),
                 textOf(record.function),
                 textOf(record.source),
                 record.line,
                 record.component,
                 record.level,
                 record.reserved1 == nullptr,
                 record.reserved2,
                 record.reserved3,
                 record.message};
    std::lock_guard lock(store_.guard);
    store_.lines.push_back(std::move(line));
}

LogCapture::LogCapture() : store_(new Store) {
    CVLog::CVLogger::setLog(&store_->log, std::numeric_limits<int>::min());
    CVLog::CVLogger::setTrace(&store_->trace, std::numeric_limits<int>::min());
}

LogCapture::~LogCapture() {
    static CVLog::DescriptorSink standardError(STDERR_FILENO);
    CVLog::CVLogger::setLog(&standardError, 6000);
    CVLog::CVLogger::setTrace(nullptr, 0);
    delete store_;
}

std::vector<LogLine> LogCapture::lines() const {
    std::lock_guard lock(store_->guard);
    return store_->lines;
}

std::vector<std::string> LogCapture::messages() const {
    return logged(lines());
}

std::vector<std::string> LogCapture::messages(int level) const {
    return logged(lines(), level);
}

std::vector<LogLine> LogCapture::ownLines() const {
    std::vector<LogLine> own = lines();
    std::erase_if(own, [](const LogLine& line) { return line.thread != std::this_thread::get_id(); });
    return own;
}

std::vector<std::string> LogCapture::ownMessages() const {
    return logged(ownLines());
}

std::vector<std::string> LogCapture::ownMessages(int level) const {
    return logged(ownLines(), level);
}

void LogCapture::clear() {
    std::lock_guard lock(store_->guard);
    store_->lines.clear();
}

testing::AssertionResult LogCapture::everyLineTwice() const {
    std::map<std::thread::id, LogLine> waiting;  // logged, not traced yet
    std::set<std::thread::id> heard{std::this_thread::get_id()};
    for (const LogLine& line : lines()) {
        auto logged = waiting.find(line.thread);
        const bool isFirst = heard.insert(line.thread).second;
        if (line.channel == Channel::log) {
            if (logged != waiting.end())
                return testing::AssertionFailure() << "not traced: " << describe(logged->second);
            waiting.emplace(line.thread, line);
        } else {
            if (isFirst) continue;  // another thread was in the middle of a line when the capture began
            if (logged == waiting.end())
                return testing::AssertionFailure() << "traced alone: " << describe(line);
            if (!logged->second.sameArguments(line))
                return testing::AssertionFailure() << describe(logged->second) << "\nbut " << describe(line);
            waiting.erase(logged);
        }
    }
    if (!waiting.empty())
        return testing::AssertionFailure() << "not traced: " << describe(waiting.begin()->second);
    return testing::AssertionSuccess();
}
