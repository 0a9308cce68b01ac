#include "plugins/hardware/host.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cctype>
#include <cerrno>
#include <filesystem>
#include <sstream>
#include <utility>

#include "framework/qx/utf8.h"
#include "framework/qx/whole_number.h"

namespace hardware {

namespace {

/// Never blocks on a FIFO that somebody put in the place of a file.
std::optional<std::string> readFile(const std::string& path, std::size_t most) {
    const int file = open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY);
    if (file < 0) {
        return std::nullopt;
    }
    std::string text;
    std::array<char, 4096> piece{};
    ssize_t count = 0;
    while (text.size() < most &&
           ((count = read(file, piece.data(), piece.size())) > 0 || (count < 0 && errno == EINTR))) {
        text.append(piece.data(), count > 0 ? static_cast<std::size_t>(count) : 0);
    }
    close(file);
    return count < 0 ? std::nullopt : std::optional(std::move(text));
}

bool isDigit(char letter) {
    return letter >= '0' && letter <= '9';
}

std::string digitsAt(const std::string& text, std::size_t place) {
    const std::size_t start = std::min(text.find_first_not_of('0', place), text.size());
    const auto end = std::find_if_not(text.begin() + static_cast<std::ptrdiff_t>(start), text.end(), isDigit);
    return {text.begin() + static_cast<std::ptrdiff_t>(start), end};
}

std::size_t endOfDigits(const std::string& text, std::size_t place) {
    return std::min(text.find_first_not_of("0123456789", place), text.size());
}

/// The bytes of the printable UTF-8 letter at a place; 0 where there is none.
std::size_t letterAt(const std::string& text, std::size_t place) {
    const QX::Utf8Character letter = QX::firstUtf8Character(std::string_view(text).substr(place));
    const bool control = letter.code < ' ' || (letter.code >= 0x7f && letter.code < 0xa0);
    return control ? 0 : letter.length;
}

}  // namespace

Host::Host(std::string root, bool privileged, std::shared_ptr<Devices> devices)
    : root_(std::move(root)), privileged_(privileged), devices_(std::move(devices)) {}

std::optional<std::string> Host::text(const std::string& path, std::size_t most) const {
    return readFile(root_ + path, most);
}

std::optional<std::string> Host::line(const std::string& path) const {
    const std::optional<std::string> whole = text(path);
    if (!whole) {
        return std::nullopt;
    }
    std::string first = printable(trimmed(whole->substr(0, whole->find('\n'))));
    return first.empty() ? std::nullopt : std::optional(std::move(first));
}

std::vector<std::string> Host::lines(const std::string& path) const {
    std::vector<std::string> all;
    std::istringstream stream(text(path).value_or(""));
    for (std::string one; std::getline(stream, one);) {
        all.push_back(one);
    }
    return all;
}

std::optional<unsigned long long> Host::number(const std::string& path) const {
    const std::optional<std::string> first = line(path);
    return first ? asNumber(*first) : std::nullopt;
}

std::optional<long long> Host::signedNumber(const std::string& path) const {
    const std::optional<std::string> first = line(path);
    return first ? asSigned(*first) : std::nullopt;
}

std::optional<bool> Host::flag(const std::string& path) const {
    const std::optional<std::string> first = line(path);
    if (first == "1" || first == "Y") {
        return true;
    }
    return first == "0" || first == "N" ? std::optional(false) : std::nullopt;
}

std::optional<std::string> Host::field(const std::string& path, const std::string& key) const {
    for (const std::string& one : lines(path)) {
        if (one.starts_with(key + "=")) {
            return printable(one.substr(key.size() + 1));
        }
    }
    return std::nullopt;
}

std::vector<std::string> Host::entries(const std::string& directory) const {
    std::vector<std::string> names;
    std::error_code error;
    for (std::filesystem::directory_iterator at(root_ + directory, error), end; !error && at != end;
         at.increment(error)) {
        names.push_back(at->path().filename().string());
    }
    std::sort(names.begin(), names.end(), comesBefore);
    return names;
}

std::optional<std::string> Host::target(const std::string& link) const {
    std::error_code error;
    const std::filesystem::path where = std::filesystem::read_symlink(root_ + link, error);
    return error ? std::nullopt : std::optional(where.filename().string());
}

std::optional<std::string> Host::resolved(const std::string& path) const {
    std::error_code error;
    const std::string base = root_.empty() ? "" : std::filesystem::canonical(root_, error).string();
    const std::string where = std::filesystem::canonical(root_ + path, error).string();
    return error || !where.starts_with(base) ? std::nullopt : std::optional(where.substr(base.size()));
}

bool Host::exists(const std::string& path) const {
    std::error_code error;
    return std::filesystem::exists(root_ + path, error);
}

bool comesBefore(const std::string& left, const std::string& right) {
    std::size_t at = 0;
    std::size_t other = 0;
    while (at < left.size() && other < right.size()) {
        if (isDigit(left[at]) && isDigit(right[other])) {
            const std::string one = digitsAt(left, at);
            const std::string two = digitsAt(right, other);
            if (one != two) {
                return one.size() != two.size() ? one.size() < two.size() : one < two;
            }
            at = endOfDigits(left, at);
            other = endOfDigits(right, other);
        } else if (left[at] != right[other]) {
            return left[at] < right[other];
        } else {
            ++at;
            ++other;
        }
    }
    return left.size() - at < right.size() - other ||
           (left.size() - at == right.size() - other && left < right);
}

std::string printable(std::string text) {
    for (std::size_t at = 0; at < text.size();) {
        const std::size_t length = letterAt(text, at);
        if (length == 0) {
            text[at] = '?';
        }
        at += std::max<std::size_t>(length, 1);
    }
    return text;
}

std::string trimmed(const std::string& text) {
    constexpr std::string_view kBlank(" \t\r\n\0", 5);
    const std::size_t first = text.find_first_not_of(kBlank);
    return first == std::string::npos ? "" : text.substr(first, text.find_last_not_of(kBlank) - first + 1);
}

std::optional<unsigned long long> asNumber(const std::string& text) {
    const bool hexadecimal = text.starts_with("0x");
    return QX::wholeNumber<unsigned long long>(std::string_view(text).substr(hexadecimal ? 2 : 0),
                                               hexadecimal ? 16 : 10);
}

std::optional<long long> asSigned(const std::string& text) {
    const bool negative = text.starts_with('-');
    const auto value = asNumber(text.substr(negative ? 1 : 0));
    if (!value || *value > static_cast<unsigned long long>(INT64_MAX)) {
        return std::nullopt;
    }
    return negative ? -static_cast<long long>(*value) : static_cast<long long>(*value);
}

}  // namespace hardware
