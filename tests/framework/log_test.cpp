#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <array>
#include <atomic>
#include <fstream>
#include <iomanip>
#include <locale>
#include <mutex>
#include <sstream>
#include <stdexcept>
#include <thread>

#include "framework/cvlog/logger.h"
#include "framework/cvlog/message_buffer.h"
#include "tests/support/texts_are.h"

namespace {

using CVLog::CVLogger;
using CVLog::CVMessageBuffer;
using CVLog::DescriptorSink;
using CVLog::LogRecord;
using testing::ElementsAre;
using testing::MatchesRegex;

class Recorder : public CVLog::LogSink {
public:
    void write(const LogRecord& record) override {
        const std::lock_guard lock(guard_);
        messages_.push_back(std::to_string(record.level) + " " + record.message);
        last_ = std::string(record.function) + "|" + record.source + "|" + std::to_string(record.line) + "|" +
                record.component + "|" + (record.reserved1 == nullptr ? "null" : "set") + "|" +
                std::to_string(record.reserved2) + "|" + std::to_string(record.reserved3);
    }
    std::vector<std::string> messages() const { return messages_; }
    std::string last() const { return last_; }

private:
    std::mutex guard_;
    std::vector<std::string> messages_;
    std::string last_;
};

class Log : public testing::Test {
protected:
    ~Log() override {
        static DescriptorSink standardError(2);
        CVLogger::setLog(&standardError, 6000);
        CVLogger::setTrace(nullptr, 0);
    }
    static void logLine(int level, const std::string& message) {
        CVLogger::logLevelMessage("initialize", "OsHwMI_ix86", 12, "Corvista.IC.MI.OsHwMI", level, nullptr, 0,
                                  0, message);
    }
    static void traceLine(int level, const std::string& message) {
        CVLogger::traceLevelMessage("initialize", "OsHwMI_ix86", 12, "Corvista.IC.MI.OsHwMI", level, nullptr,
                                    0, 0, message);
    }
};

TEST_F(Log, LinesFromTheThresholdUpReachTheirSink) {
    Recorder log;
    Recorder trace;
    CVLogger::setLog(&log, 5000);
    CVLogger::setTrace(&trace, 0);
    for (const int level : {3000, 5000, 6000}) {
        logLine(level, "log");
        traceLine(level, "trace");
    }
    EXPECT_THAT(log.messages(), TextsAre("5000 log", "6000 log"));
    EXPECT_THAT(trace.messages(), TextsAre("3000 trace", "5000 trace", "6000 trace"));
}

TEST_F(Log, ASinkSeesAllArguments) {
    Recorder log;
    CVLogger::setLog(&log, 0);
    std::string text = "x";
    CVLogger::logLevelMessage("run", "OsHwMIInd_ix86", 99, "component", 3000, text.data(), 1, 2, "message");
    EXPECT_EQ(log.last(), "run|OsHwMIInd_ix86|99|component|set|1|2");
}

TEST_F(Log, ASinkThatIsTakenAwayHearsNothing) {
    Recorder log;
    CVLogger::setLog(&log, 0);
    CVLogger::setLog(nullptr, 0);
    logLine(6000, "lost");
    logLine(std::numeric_limits<int>::max(), "lost");
    EXPECT_THAT(log.messages(), ElementsAre());
}

TEST_F(Log, NothingASinkThrowsComesOut) {
    class Thrower : public CVLog::LogSink {
    public:
        void write(const LogRecord& /*record*/) override { throw std::runtime_error("disk full"); }
    } thrower;
    CVLogger::setLog(&thrower, 0);
    CVLogger::setTrace(&thrower, 0);
    logLine(6000, "a");
    traceLine(6000, "a");
    CVLogger::setTrace(nullptr, 0);
    SUCCEED();
}

TEST_F(Log, AReplacedSinkIsNotUsedAnyMore) {
    /// Fails when it is written to after its end, which the sanitizers see as well.
    class Mortal : public CVLog::LogSink {
    public:
        explicit Mortal(std::atomic<int>& late) : late_(late) {}
        ~Mortal() override { dead_ = true; }
        void write(const LogRecord& /*record*/) override { late_ += dead_ ? 1 : 0; }

    private:
        std::atomic<int>& late_;
        std::atomic<bool> dead_ = false;
    };
    std::atomic<int> late = 0;
    std::atomic<bool> done = false;
    auto sink = std::make_unique<Mortal>(late);
    CVLogger::setLog(sink.get(), 0);
    std::vector<std::thread> writers;
    for (int count = 0; count < 4; ++count) {
        writers.emplace_back([&] {
            while (!done) {
                logLine(3000, "again");
            }
        });
    }
    for (int round = 0; round < 200; ++round) {
        auto next = std::make_unique<Mortal>(late);
        CVLogger::setLog(next.get(), 0);
        sink = std::move(next);
    }
    CVLogger::setLog(nullptr, 0);
    done = true;
    for (std::thread& writer : writers) {
        writer.join();
    }
    EXPECT_EQ(late, 0);
}

TEST_F(Log, ALineShowsEverythingInItsOrder) {
    const std::string component = "Corvista.IC.MI.OsHwMI";
    const std::string message = "initialize: entry";
    const LogRecord record{"initialize", "OsHwMI_ix86", 120, component, 3000, nullptr, 0, 0, message};
    EXPECT_THAT(
        CVLog::formatRecord(record),
        MatchesRegex("[0-9]{4}-[0-9]{2}-[0-9]{2}T[0-9]{2}:[0-9]{2}:[0-9]{2}\\.[0-9]{3}[+-][0-9]{4} " +
                     std::to_string(gettid()) +
                     " 3000 Corvista\\.IC\\.MI\\.OsHwMI OsHwMI_ix86:120 initialize: initialize: entry"));
}

TEST_F(Log, ARecordStaysOneLine) {
    const std::string component = "c";
    const std::string message = "Entering\r\nagain\n";
    const LogRecord record{nullptr, nullptr, 1, component, 3000, nullptr, 0, 0, message};
    EXPECT_TRUE(CVLog::formatRecord(record).ends_with(" 3000 c (null):1 (null): Entering\\r\\nagain\\n"));
}

/// A file that is gone when the test is over, with what was written to it.
class ScratchFile {
public:
    ScratchFile() : file_(tmpfile()) {}
    ~ScratchFile() { fclose(file_); }
    int descriptor() const { return fileno(file_); }
    std::vector<std::string> lines() const {
        std::rewind(file_);
        std::vector<std::string> found;
        std::array<char, 1024> line{};
        while (fgets(line.data(), line.size(), file_) != nullptr) {
            found.emplace_back(line.data());
        }
        return found;
    }

private:
    FILE* file_;
};

TEST_F(Log, LinesOfManyThreadsDoNotMix) {
    const ScratchFile file;
    DescriptorSink sink(file.descriptor());
    CVLogger::setTrace(&sink, 0);
    std::vector<std::thread> writers;
    for (int count = 0; count < 4; ++count) {
        writers.emplace_back([] {
            for (int line = 0; line < 100; ++line) {
                traceLine(3000, std::string(200, 'x'));
            }
        });
    }
    for (std::thread& writer : writers) {
        writer.join();
    }
    CVLogger::setTrace(nullptr, 0);
    const auto lines = file.lines();
    EXPECT_EQ(lines.size(), 400U);
    for (const std::string& line : lines) {
        EXPECT_TRUE(line.ends_with(" initialize: " + std::string(200, 'x') + "\n")) << line;
    }
}

TEST_F(Log, ADescriptorThatCannotBeWrittenIsNoTrouble) {
    DescriptorSink sink(-1);
    CVLogger::setLog(&sink, 0);
    logLine(6000, "lost");
    SUCCEED();
}

TEST(MessageBuffer, TakesTextsNumbersAndFlags) {
    char characters[] = "text";
    char* const pointer = characters;
    CVMessageBuffer buffer;
    buffer << "IP Origin  = " << 7U << ' ' << -3 << " " << true << false << " " << std::string("eth0") << " "
           << pointer;
    EXPECT_EQ(buffer.str(), "IP Origin  = 732-3 10 eth0 text");  // a character is an int
}

TEST(MessageBuffer, ANullTextShowsAsSuch) {
    const char* const text = nullptr;
    char* const pointer = nullptr;
    CVMessageBuffer buffer;
    buffer << text << pointer;
    EXPECT_EQ(buffer.str(), "(null)(null)");
}

TEST(MessageBuffer, StartsEmpty) {
    EXPECT_EQ(CVMessageBuffer().str(), "");
}

TEST(MessageBuffer, ShowsTheGreatestNumbers) {
    CVMessageBuffer buffer;
    buffer << 4294967295U << " " << std::numeric_limits<int>::min();
    EXPECT_EQ(buffer.str(), "4294967295 -2147483648");
}

TEST(MessageBuffer, ItsStreamAddsAtTheRightPlace) {
    CVMessageBuffer buffer;
    buffer << "a";
    std::ostream& stream = buffer;
    stream << 12ULL << std::setw(4) << 1.5 << 'x';
    buffer << "b";
    stream << "c";
    EXPECT_EQ(buffer.str(), "a12 1.5xbc");
}

TEST(MessageBuffer, TheGlobalLocaleDoesNotMatter) {
    class Grouping : public std::numpunct<char> {
    protected:
        char do_thousands_sep() const override { return '.'; }
        std::string do_grouping() const override { return "\3"; }
    };
    const std::locale before = std::locale::global(std::locale(std::locale::classic(), new Grouping));
    CVMessageBuffer buffer;
    buffer << 1234567U << 1234567;
    static_cast<std::ostream&>(buffer) << 1234567ULL;
    std::locale::global(before);
    EXPECT_EQ(buffer.str(), "123456712345671234567");
}

}  // namespace
