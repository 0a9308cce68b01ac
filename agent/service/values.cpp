#include "agent/service/values.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <chrono>
#include <cstdlib>
#include <string_view>

#include "agent/bus/text.h"
#include "framework/qx/whole_number.h"

namespace cvagent::service {

namespace {

enum Flag : std::uint32_t { stale = 1, missing = 2, timedOut = 4, noValue = 8, placeHolder = 16 };

std::int64_t sinceEpoch(std::chrono::system_clock::time_point time) {
    return std::chrono::duration_cast<std::chrono::microseconds>(time.time_since_epoch()).count();
}

std::int64_t sinceBoot(std::chrono::steady_clock::time_point time) {
    return std::chrono::duration_cast<std::chrono::microseconds>(time.time_since_epoch()).count();
}

bool isPlainUnsigned(const IC::Number& number) {
    return number.kind() == IC::Number::unsigned32 && !number.empty();
}

std::string typeOf(const IC::Number& number) {
    static constexpr std::array kTypes = {"u", "u", "t", "b", "d", "x"};  // in the order of its kinds
    if (number.empty()) {
        return "";
    }
    const bool hasFraction =
        number.kind() == IC::Number::scaled && number.toString().find('.') != std::string::npos;
    return hasFraction ? "d" : kTypes.at(number.kind());
}

void putNumber(bus::Writer& writer, const IC::Number& number, std::string_view type) {
    if (type == "b") {
        writer.put(number.toUnsigned64() != 0);
    } else if (type == "d") {
        writer.put(number.toDouble());
    } else if (type == "t") {
        writer.put(std::uint64_t{number.toUnsigned64()});
    } else if (type == "x") {
        writer.put(static_cast<std::int64_t>(number.toUnsigned64()));  // which wraps a negative one
    } else {
        writer.put(std::uint32_t{static_cast<unsigned int>(number)});
    }
}

/// The type that all numbers of a list fit.
std::string listType(const std::vector<IC::Number>& numbers) {
    std::string type = "u";
    for (const IC::Number& number : numbers) {
        const std::string own = typeOf(number);
        if (own == "d" || own == "x") {
            type = "d";
        } else if (own == "t" && type == "u") {
            type = own;
        }
    }
    return type;
}

/// The whole and the digits behind the point of a decimal text.
void putDecimal(bus::Writer& writer, const std::string& text) {
    std::string digits = text;
    const std::size_t point = digits.find('.');
    const std::size_t scale = point == std::string::npos ? 0 : digits.size() - point - 1;
    if (point != std::string::npos) {
        digits.erase(point, 1);
    }
    writer.structure("xq", [&] {
        writer.put(QX::wholeNumber<std::int64_t>(digits).value_or(0));
        writer.put(static_cast<std::uint16_t>(scale));
    });
}

void putExactNumber(bus::Writer& writer, const IC::Number& number) {
    if (number.kind() == IC::Number::scaled && !number.empty()) {
        writer.variant("(xq)", [&] { putDecimal(writer, number.toString()); });
        return;
    }
    const std::string type = number.empty() ? "s" : typeOf(number);
    writer.variant(type.c_str(), [&] {
        if (number.empty()) {
            writer.put("");
        } else {
            putNumber(writer, number, type);
        }
    });
}

void putExactText(bus::Writer& writer, const std::string& text) {
    if (bus::isText(text)) {
        writer.variant("s", [&] { writer.put(text); });
    } else {
        writer.variant("ay", [&] { writer.putBytes(text); });
    }
}

template <class List, class Put>
void putMixed(bus::Writer& writer, const List& list, const Put& put) {
    writer.variant("av", [&] {
        writer.array("v", [&] {
            for (const auto& item : list) {
                put(writer, item);
            }
        });
    });
}

void putExactTexts(bus::Writer& writer, const std::vector<std::string>& texts) {
    const bool plain =
        std::all_of(texts.begin(), texts.end(), [](const std::string& text) { return bus::isText(text); });
    if (plain) {
        writer.variant("as", [&] { writer.put(texts); });
    } else {
        putMixed(writer, texts, putExactText);
    }
}

void putExactNumbers(bus::Writer& writer, const std::vector<IC::Number>& numbers) {
    if (!std::all_of(numbers.begin(), numbers.end(), isPlainUnsigned)) {
        putMixed(writer, numbers, putExactNumber);
        return;
    }
    writer.variant("au", [&] { writer.put(std::vector<std::uint32_t>(numbers.begin(), numbers.end())); });
}

/// The very value, so that whoever reads it can make the same one of it.
void putExact(bus::Writer& writer, const IC::PropertyValue& value) {
    if (const IC::Number* number = value.asNumber()) {
        putExactNumber(writer, *number);
    } else if (const IC::EnumValue* code = value.asEnum()) {
        writer.variant("u", [&] { writer.put(std::uint32_t{code->code()}); });
    } else if (const auto* texts = value.asTexts()) {
        putExactTexts(writer, *texts);
    } else if (const auto* numbers = value.asNumbers()) {
        putExactNumbers(writer, *numbers);
    } else {
        const std::string* text = value.asText();
        putExactText(writer, text != nullptr ? *text : std::string());
    }
}

std::uint32_t flagsOf(const Reading& reading) {
    return (reading.stale ? Flag::stale : 0U) | (reading.missing ? Flag::missing : 0U) |
           (reading.timedOut ? Flag::timedOut : 0U) | (reading.value.empty() ? Flag::noValue : 0U) |
           (!reading.value.empty() && !reading.value.known() ? Flag::placeHolder : 0U);
}

Reading withheldReading(const Reading& reading) {
    return {reading.id, reading.row, {}, "told to root and the trusted group only", true};
}

}  // namespace

std::uint64_t wallClock() {
    return static_cast<std::uint64_t>(sinceEpoch(std::chrono::system_clock::now()));
}

std::uint64_t wallClock(std::chrono::steady_clock::time_point moment) {
    constexpr std::int64_t kSet = 500000;  // by less the clock is only slewed
    static std::atomic<std::int64_t> offset{0};
    const std::int64_t now =
        sinceEpoch(std::chrono::system_clock::now()) - sinceBoot(std::chrono::steady_clock::now());
    if (std::abs(now - offset) > kSet) {
        offset = now;
    }
    return static_cast<std::uint64_t>(sinceBoot(moment) + offset);
}

bool isKnown(const Reading& reading) {
    return (!reading.failed() || reading.stale) && !typeOf(reading.value).empty();
}

bool isTrusted(const Reading& reading) {
    return reading.row != nullptr && reading.row->trusted;
}

std::string typeOf(const IC::PropertyValue& value) {
    if (const IC::Number* number = value.asNumber()) {
        return typeOf(*number);
    }
    if (const auto* numbers = value.asNumbers()) {
        return "a" + listType(*numbers);
    }
    if (value.asEnum() != nullptr) {
        return "u";
    }
    return value.asText() != nullptr ? "s" : value.asTexts() != nullptr ? "as" : "";
}

void putProperty(bus::Writer& writer, const IC::PropertyValue& value) {
    const std::string type = typeOf(value);
    writer.variant(type.c_str(), [&] {
        if (const IC::Number* number = value.asNumber()) {
            putNumber(writer, *number, type);
        } else if (const IC::EnumValue* code = value.asEnum()) {
            writer.put(std::uint32_t{code->code()});
        } else if (const auto* texts = value.asTexts()) {
            writer.put(*texts);
        } else if (const auto* numbers = value.asNumbers()) {
            writer.array(type.c_str() + 1, [&] {
                for (const IC::Number& each : *numbers) {
                    putNumber(writer, each, std::string_view(type).substr(1));
                }
            });
        } else {
            writer.put(*value.asText());
        }
    });
}

void putReading(bus::Writer& writer, const Reading& reading) {
    writer.structure("uyvtus", [&] {
        writer.put(std::uint32_t{reading.id}).put(static_cast<std::uint8_t>(reading.value.kind()));
        putExact(writer, reading.value);
        writer.put(reading.asOf ? wallClock(*reading.asOf) : std::uint64_t{0});
        writer.put(flagsOf(reading)).put(reading.error);
    });
}

void putReadings(bus::Writer& writer, const std::vector<Reading>& readings, Withheld withheld) {
    writer.array(kReadingType, [&] {
        for (const Reading& reading : readings) {
            if (withheld == Withheld::nothing || !isTrusted(reading)) {
                putReading(writer, reading);
            } else if (withheld == Withheld::asMissing) {
                putReading(writer, withheldReading(reading));
            }
        }
    });
}

void putEvent(bus::Writer& writer, const Event& event) {
    constexpr std::uint64_t kMicroseconds = 1000000;
    const Property* row = nullptr;
    if (const NodeClass* known = findClass(event.nodeClass)) {
        row = findProperty(static_cast<unsigned int>(known->type), event.property);
    }
    const bool withheld = !event.propertyName.empty() && row != nullptr && row->trusted;
    writer.structure("tstusssussssssau", [&] {
        writer.put(std::uint64_t{event.number}).put(eventName(event.kind));
        writer.put(static_cast<std::uint64_t>(event.time) * kMicroseconds);
        writer.put(std::uint32_t{event.nodeId}).put(event.nodeClass).put(event.path).put(event.message);
        writer.put(std::uint32_t{event.property}).put(event.propertyName);
        writer.put(withheld ? "" : event.before).put(withheld ? "" : event.after).put(event.caller);
        writer.put(withheld ? "" : event.wanted).put(event.verdict);
        writer.put(std::vector<std::uint32_t>{event.firstCode, event.secondCode, event.eventCode});
    });
}

std::vector<std::string> takeWords(bus::Reader& reader) {
    constexpr std::size_t kMost = 1024;
    std::vector<std::string> words;
    reader.variant([&](const std::string& type) {
        if (type.size() == 2 && type.front() == 'a') {
            reader.array(type.c_str() + 1, [&] {
                if (words.size() == kMost) {
                    throw bus::Error(bus::kLimitsExceeded, "too many values in one call");
                }
                words.push_back(reader.asWord());
            });
        } else {
            words.push_back(reader.asWord());
        }
    });
    return words;
}

}  // namespace cvagent::service
