#include "agent/cli/print.h"

#include <poll.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <charconv>
#include <cstdlib>
#include <cstring>

#include "agent/cli/failure.h"
#include "agent/core/surroundings.h"

namespace cvagent {

namespace {

/// A number with so many digits behind the point, whatever the locale.
std::string fixedPoint(double number, int decimals) {
    std::array<char, 64> text{};
    const auto written = std::to_chars(text.begin(), text.end(), number, std::chars_format::fixed, decimals);
    return {text.begin(), written.ptr};
}

/// "12.3 GB": a size in steps of 1000 or 1024, with the unit that keeps it short.
std::string scaled(double size, double step, const std::array<const char*, 6>& units) {
    std::size_t unit = 0;
    while (size >= step && unit + 1 < units.size()) {
        size /= step;
        ++unit;
    }
    const int decimals = unit == 0 || size >= 1000 ? 0 : 1;
    return fixedPoint(size, decimals) + " " + units.at(unit);
}

std::string speedText(unsigned long long kilobits) {
    std::string text = scaled(static_cast<double>(kilobits) * 1000, 1000,
                              {"bit/s", "kbit/s", "Mbit/s", "Gbit/s", "Tbit/s", "Pbit/s"});
    const std::size_t fraction = text.find(".0 ");
    return fraction == std::string::npos ? text : text.erase(fraction, 2);
}

std::string offsetText(long long minutes) {
    const auto twoDigits = [](long long number) { return (number < 10 ? "0" : "") + std::to_string(number); };
    const long long size = std::abs(minutes);
    return (minutes < 0 ? "UTC-" : "UTC+") + twoDigits(size / 60) + ":" + twoDigits(size % 60);
}

/// What a number comes to in larger units; empty when there is nothing to add.
std::string inLargerUnits(Unit unit, const IC::Number& number) {
    switch (unit) {
        case Unit::bytes:
            return number.toUnsigned64() < 10000 ? "" : sizeText(number.toUnsigned64());
        case Unit::kilohertz:
            return fixedPoint(number.toDouble() / 1e6, 2) + " GHz";
        case Unit::thousandBytes:
            return sizeText(number.toUnsigned64() * 1000);
        case Unit::kibibytes:
            return sizeText(number.toUnsigned64() * 1024);
        case Unit::kilobitsPerSecond:
            return speedText(number.toUnsigned64());
        case Unit::secondsSinceEpoch:
            return timeText(static_cast<std::time_t>(number.toUnsigned64()));
        case Unit::minutes:
            return offsetText(static_cast<int>(static_cast<unsigned int>(number)));
        default:
            return {};
    }
}

std::string withLabel(const Property* property, const std::string& code, unsigned int number) {
    const Label* label = property != nullptr ? findLabel(*property, number) : nullptr;
    return label == nullptr ? code : code + " (" + label->text + ")";
}

std::string numberText(const Property* property, const IC::Number& number) {
    std::string text = number.toString();
    if (property == nullptr || number.empty() || number.kind() == IC::Number::boolean) {
        return text;
    }
    if (!property->labels.empty() && findLabel(*property, number) != nullptr) {
        return withLabel(property, text, number);
    }
    if (property->unit != Unit::none) {
        text += std::string(" ") + unitName(*property);
    }
    const std::string larger = inLargerUnits(property->unit, number);
    return larger.empty() ? text : text + ", " + larger;
}

template <class List, class ToText>
std::string joined(const List& list, ToText toText) {
    std::string text;
    for (const auto& item : list) {
        text += (text.empty() ? "" : ", ") + toText(item);
    }
    return text;
}

std::string plainText(const Property* property, const IC::PropertyValue& value) {
    if (const IC::Number* number = value.asNumber()) {
        return numberText(property, *number);
    }
    if (const IC::EnumValue* code = value.asEnum()) {
        return withLabel(property, std::to_string(code->code()), code->code());
    }
    if (const auto* texts = value.asTexts()) {
        return joined(*texts, [](const std::string& text) { return text; });
    }
    if (const auto* numbers = value.asNumbers()) {
        return joined(*numbers, [&](const IC::Number& number) { return numberText(property, number); });
    }
    return static_cast<std::string>(value);
}

bool isUtf8Locale() {
    for (const char* name : {"LC_ALL", "LC_CTYPE", "LANG"}) {
        const char* value = std::getenv(name);
        if (value != nullptr && *value != '\0') {
            const std::string locale = value;
            return locale.find("UTF-8") != std::string::npos || locale.find("utf8") != std::string::npos;
        }
    }
    return false;
}

/// @return 0, or an errno
int writeAll(int descriptor, const std::string& text) {
    for (std::size_t done = 0; done < text.size();) {
        const ssize_t size = write(descriptor, text.data() + done, text.size() - done);
        if (size > 0) {
            done += static_cast<std::size_t>(size);
        } else if (errno == EAGAIN) {  // whoever shares the pipe may have made it so
            pollfd room{descriptor, POLLOUT, 0};
            poll(&room, 1, -1);
        } else if (errno != EINTR) {
            return errno;
        }
    }
    return 0;
}

Style look() {
    const char* noColour = std::getenv("NO_COLOR");
    const char* terminal = std::getenv("TERM");
    const bool dumb = terminal == nullptr || std::strcmp(terminal, "dumb") == 0;
    Style style;
    style.colour = isatty(STDOUT_FILENO) == 1 && !dumb && (noColour == nullptr || *noColour == '\0');
    style.lines = isUtf8Locale();
    return style;
}

}  // namespace

const Style& Style::detect() {
    static const Style style = look();
    return style;
}

std::string Style::paint(const std::string& text, const char* code) const {
    return colour && !text.empty() ? std::string("\x1b[") + code + "m" + text + "\x1b[0m" : text;
}

/// A reader that has seen enough (head, less) needs no message.
void print(const std::string& text) {
    const int error = standardOutputWasClosed() ? EBADF : writeAll(STDOUT_FILENO, text);
    if (error != 0) {
        throw Failure(
            ExitStatus::failed,
            error == EPIPE ? "" : std::string("cannot write to standard output: ") + std::strerror(error));
    }
}

void complain(const std::string& text) {
    std::string shown = "cvagent: ";
    for (std::size_t start = 0; start <= text.size();) {
        const std::size_t end = std::min(text.find('\n', start), text.size());
        shown += printable(text.substr(start, end - start)) + "\n";
        start = end + 1;
    }
    [[maybe_unused]] const ssize_t written = write(messageDescriptor(), shown.data(), shown.size());
}

void ask(const std::string& question) {
    [[maybe_unused]] const ssize_t written = write(messageDescriptor(), question.data(), question.size());
}

std::string valueText(const Property* property, const IC::PropertyValue& value) {
    if (value.empty()) {
        return "not known";
    }
    std::string text;
    try {
        text = plainText(property, value);
    } catch (const IC::ConversionError&) {  // a number that does not fit what it counts
        text = static_cast<std::string>(value);
    }
    if (text.empty()) {
        return value.kind() == IC::PropertyValue::text ? "(empty)" : "(none)";
    }
    return printable(text);
}

std::string sizeText(unsigned long long bytes) {
    const auto size = static_cast<double>(bytes);
    if (size < 1000) {
        return scaled(size, 1000, {"B", "kB", "MB", "GB", "TB", "PB"});
    }
    return scaled(size, 1000, {"B", "kB", "MB", "GB", "TB", "PB"}) + " (" +
           scaled(size, 1024, {"B", "KiB", "MiB", "GiB", "TiB", "PiB"}) + ")";
}

std::string padded(const std::string& text, std::size_t width) {
    const auto isStart = [](char c) { return (static_cast<unsigned char>(c) & 0xC0U) != 0x80U; };
    const auto length = static_cast<std::size_t>(std::count_if(text.begin(), text.end(), isStart));
    return text + std::string(length < width ? width - length : 0, ' ');
}

}  // namespace cvagent
