#include "agent/service/config.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <iterator>
#include <optional>
#include <set>

#include "agent/core/owners.h"
#include "agent/core/problem.h"
#include "agent/core/text.h"
#include "framework/qx/whole_number.h"

namespace cvagent::service {

namespace {

constexpr std::size_t kMostBytes = std::size_t{64} << 10U;
constexpr std::size_t kMostComplaints = 20;

using Setter = bool (*)(Config& config, const std::string& value);

/// The number when it lies within the bounds.
std::optional<long> numberWithin(const std::string& value, long least, long most) {
    const auto number = QX::wholeNumber<long>(value);
    return number && *number >= least && *number <= most ? number : std::nullopt;
}

template <auto Member, long Least, long Most, bool ZeroToo = false>
bool setDuration(Config& config, const std::string& value) {
    const auto number = ZeroToo && value == "0" ? std::optional(0L) : numberWithin(value, Least, Most);
    if (!number) {
        return false;
    }
    config.*Member = std::remove_reference_t<decltype(config.*Member)>(*number);
    return true;
}

bool setGroup(Config& config, const std::string& value) {
    const auto isFine = [](char byte) {
        return (byte >= 'a' && byte <= 'z') || (byte >= '0' && byte <= '9') || byte == '_' || byte == '-';
    };
    constexpr std::size_t kLongest = 32;
    if (value.empty() || value.size() > kLongest || !std::ranges::all_of(value, isFine)) {
        return false;
    }
    config.trustedGroup = value;
    return true;
}

bool setHistoryAge(Config& config, const std::string& value) {
    constexpr long kMostDays = 36500;
    const auto days = numberWithin(value, 1, kMostDays);
    config.historyAge = std::chrono::hours(24 * days.value_or(1));
    return days.has_value();
}

bool setHistorySize(Config& config, const std::string& value) {
    constexpr long kMostMebibytes = 65536;
    const auto mebibytes = numberWithin(value, 1, kMostMebibytes);
    config.historyBytes = static_cast<std::uint64_t>(mebibytes.value_or(1)) << 20U;
    return mebibytes.has_value();
}

struct Key {
    const char* name;
    Setter set;
    const char* accepts;
};

constexpr Key kKeys[] = {
    {"look-every", setDuration<&Config::lookEvery, 10, 86400, true>,
     "seconds from 10 to 86400, or 0 for never"},
    {"settling-time", setDuration<&Config::settlingTime, 0, 1000>, "milliseconds from 0 to 1000"},
    {"command-timeout", setDuration<&Config::commandTime, 1, 3600, true>,
     "seconds from 1 to 3600, or 0 for no limit"},
    {"trusted-group", setGroup, "the name of a group"},
    {"history-days", setHistoryAge, "days from 1 to 36500"},
    {"history-size", setHistorySize, "mebibytes from 1 to 65536"},
};

std::string trimmed(std::string_view text) {
    constexpr std::string_view kBlanks = " \t\r";
    const std::size_t start = text.find_first_not_of(kBlanks);
    const std::size_t end = text.find_last_not_of(kBlanks);
    return start == std::string_view::npos ? "" : std::string(text.substr(start, end - start + 1));
}

/// What is wrong with a line; "" for nothing.
std::string takeLine(const std::string& line, Config& config, std::set<std::string>& seen) {
    if (line.empty() || line.front() == '#') {
        return "";
    }
    const std::size_t equals = line.find('=');
    if (equals == std::string::npos) {
        return inQuotes(line) + " is no \"key = value\"";
    }
    const std::string name = trimmed(std::string_view(line).substr(0, equals));
    const std::string value = trimmed(std::string_view(line).substr(equals + 1));
    const auto key = std::ranges::find(kKeys, name, &Key::name);
    if (key == std::end(kKeys)) {
        return "there is no key " + inQuotes(name);
    }
    if (!seen.insert(name).second) {
        return "a second " + name;
    }
    return key->set(config, value) ? "" : name + " is " + inQuotes(value) + ", but takes " + key->accepts;
}

/// The file's text; nothing when there is none. Throws Problem.
std::optional<std::string> contentOf(const std::string& file) {
    const auto fail = [&file](const std::string& why) {
        throw Problem(Problem::failed, "cannot read " + inQuotes(file) + ": " + why);
    };
    const int descriptor = open(file.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY);
    if (descriptor < 0) {
        if (errno != ENOENT) {
            fail(std::strerror(errno));
        }
        return std::nullopt;
    }
    struct stat found {};
    const bool known = fstat(descriptor, &found) == 0;
    std::string text(kMostBytes + 1, '\0');
    const bool regular = known && S_ISREG(found.st_mode);
    const ssize_t size = regular ? read(descriptor, text.data(), text.size()) : 0;
    close(descriptor);
    if (!regular) {
        fail("it is no file");
    }
    if (isSomebodyElses(found) || (found.st_mode & (S_IWGRP | S_IWOTH)) != 0) {
        fail("others than root can write it");
    }
    if (size < 0 || static_cast<std::size_t>(size) > kMostBytes) {
        fail(size < 0 ? "it gives nothing" : "it is too long");
    }
    text.resize(static_cast<std::size_t>(size));
    return text;
}

}  // namespace

ReadConfig parseConfig(std::string_view text) {
    ReadConfig result;
    std::set<std::string> seen;
    std::size_t number = 0;
    for (std::size_t start = 0; start < text.size();) {
        const std::size_t end = std::min(text.find('\n', start), text.size());
        const std::string wrong = takeLine(trimmed(text.substr(start, end - start)), result.config, seen);
        ++number;
        if (!wrong.empty() && result.complaints.size() < kMostComplaints) {
            result.complaints.push_back("line " + std::to_string(number) + ": " + wrong);
        }
        start = end + 1;
    }
    return result;
}

ReadConfig readConfig(const std::string& file, bool mustExist) {
    const std::optional<std::string> text = contentOf(file);
    if (!text && mustExist) {
        throw Problem(Problem::failed, "there is no file " + inQuotes(file));
    }
    return parseConfig(text.value_or(""));
}

}  // namespace cvagent::service
