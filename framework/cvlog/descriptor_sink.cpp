#include <sys/time.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <ctime>
#include <string_view>

#include "framework/cvlog/logger.h"

namespace CVLog {
namespace {

/// Local time with milliseconds and offset: 2026-11-20T21:03:00.123+0100.
std::string now() {
    static_assert(sizeof(time_t) == sizeof(long long), "times after January 2038 need 64 bits");
    timeval time{};
    gettimeofday(&time, nullptr);
    tm local{};
    localtime_r(&time.tv_sec, &local);
    std::array<char, 32> date{};
    std::array<char, 8> offset{};
    const std::size_t dateLength = strftime(date.data(), date.size(), "%Y-%m-%dT%H:%M:%S", &local);
    const std::size_t offsetLength = strftime(offset.data(), offset.size(), "%z", &local);
    // Four digits, of which the first makes way for the point.
    std::string fraction = std::to_string(1000 + time.tv_usec / 1000);
    fraction.front() = '.';
    return std::string(date.data(), dateLength) + fraction + std::string(offset.data(), offsetLength);
}

/// Line breaks spelt out, so that a record stays one line.
std::string onOneLine(std::string_view text) {
    std::string line;
    line.reserve(text.size());
    for (const char character : text) {
        switch (character) {
            case '\n':
                line += "\\n";
                break;
            case '\r':
                line += "\\r";
                break;
            default:
                line += character;
        }
    }
    return line;
}

const char* orNull(const char* text) {
    return text != nullptr ? text : "(null)";
}

}  // namespace

std::string formatRecord(const LogRecord& record) {
    return now() + " " + std::to_string(gettid()) + " " + std::to_string(record.level) + " " +
           record.component + " " + orNull(record.source) + ":" + std::to_string(record.line) + " " +
           orNull(record.function) + ": " + onOneLine(record.message);
}

DescriptorSink::~DescriptorSink() = default;

void DescriptorSink::write(const LogRecord& record) {
    const std::string line = formatRecord(record) + "\n";
    // One write a line keeps the lines of threads and processes apart; only a pipe or a full disk takes less
    // than all.
    std::string_view rest = line;
    while (!rest.empty()) {
        const ssize_t written = ::write(descriptor_, rest.data(), rest.size());
        if (written >= 0) {
            rest.remove_prefix(static_cast<std::size_t>(written));
        } else if (errno != EINTR) {
            return;
        }
    }
}

}  // namespace CVLog
