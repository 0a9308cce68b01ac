#include "agent/bus/reader.h"

#include <array>
#include <charconv>
#include <type_traits>

namespace cvagent::bus {

namespace {

std::string orNothing(const char* text) {
    return text != nullptr ? text : "";
}

/// What is read is what somebody sent.
void checkRead(int result) {
    if (result <= 0) {
        throw Error(kInvalidArgs, "the message holds something else than was expected");
    }
}

template <class Number>
std::string decimal(Number number) {
    std::array<char, 64> text{};
    const auto end = std::to_chars(text.begin(), text.end(), number).ptr;
    return {text.begin(), end};
}

}  // namespace

Reader::Reader(const Message& message) : message_(message.get()) {
    checkRead(sd_bus_message_rewind(message_, 1) < 0 ? -1 : 1);
}

void Reader::basic(char type, void* value) {
    checkRead(sd_bus_message_read_basic(message_, type, value));
}

void Reader::enter(char type, const char* contents) {
    checkRead(sd_bus_message_enter_container(message_, type, contents));
}

void Reader::leave() {
    if (sd_bus_message_exit_container(message_) < 0) {
        throw Error(kInvalidArgs, "the message holds more than was expected");
    }
}

bool Reader::flag() {
    int value = 0;
    basic(SD_BUS_TYPE_BOOLEAN, &value);
    return value != 0;
}

std::uint8_t Reader::byte() {
    std::uint8_t value = 0;
    basic(SD_BUS_TYPE_BYTE, &value);
    return value;
}

std::uint32_t Reader::number() {
    std::uint32_t value = 0;
    basic(SD_BUS_TYPE_UINT32, &value);
    return value;
}

std::uint64_t Reader::longNumber() {
    std::uint64_t value = 0;
    basic(SD_BUS_TYPE_UINT64, &value);
    return value;
}

double Reader::real() {
    double value = 0;
    basic(SD_BUS_TYPE_DOUBLE, &value);
    return value;
}

std::string Reader::text() {
    const char* value = nullptr;
    basic(SD_BUS_TYPE_STRING, &value);
    return orNothing(value);
}

std::string Reader::path() {
    const char* value = nullptr;
    basic(SD_BUS_TYPE_OBJECT_PATH, &value);
    return orNothing(value);
}

std::vector<std::string> Reader::texts() {
    std::vector<std::string> all;
    array("s", [&] { all.push_back(text()); });
    return all;
}

std::vector<std::uint32_t> Reader::numbers() {
    std::vector<std::uint32_t> all;
    array("u", [&] { all.push_back(number()); });
    return all;
}

std::string Reader::bytes() {
    const void* data = nullptr;
    std::size_t size = 0;
    if (sd_bus_message_read_array(message_, SD_BUS_TYPE_BYTE, &data, &size) < 0) {
        throw Error(kInvalidArgs, "the message holds something else than bytes");
    }
    return size == 0 ? std::string() : std::string(static_cast<const char*>(data), size);
}

/// Whether there is a basic value of the type; if so it becomes the word.
template <class Value>
bool Reader::takeAs(char type, char wanted, std::string& word) {
    if (type != wanted) {
        return false;
    }
    Value value{};
    basic(type, &value);
    if constexpr (std::is_pointer_v<Value>) {
        word = orNothing(value);
    } else {
        word = decimal(value);
    }
    return true;
}

std::string Reader::asWord() {
    char type = 0;
    checkRead(sd_bus_message_peek_type(message_, &type, nullptr));
    std::string word;
    const bool taken = takeAs<const char*>(type, 's', word) || takeAs<const char*>(type, 'o', word) ||
                       takeAs<const char*>(type, 'g', word) || takeAs<int>(type, 'b', word) ||
                       takeAs<std::uint8_t>(type, 'y', word) || takeAs<std::int16_t>(type, 'n', word) ||
                       takeAs<std::uint16_t>(type, 'q', word) || takeAs<std::int32_t>(type, 'i', word) ||
                       takeAs<std::uint32_t>(type, 'u', word) || takeAs<std::int64_t>(type, 'x', word) ||
                       takeAs<std::uint64_t>(type, 't', word) || takeAs<double>(type, 'd', word);
    if (!taken) {
        throw Error(kInvalidArgs, "the message holds something else than a text, a number or a flag");
    }
    return word;
}

std::string Reader::variantType() {
    const char* contents = nullptr;
    char type = 0;
    checkRead(sd_bus_message_peek_type(message_, &type, &contents));
    if (type != SD_BUS_TYPE_VARIANT) {
        throw Error(kInvalidArgs, "the message holds something else than a variant");
    }
    return orNothing(contents);
}

void Reader::skip() {
    checkRead(sd_bus_message_skip(message_, nullptr));
}

bool Reader::atEnd() {
    const int result = sd_bus_message_at_end(message_, 0);
    checkRead(result < 0 ? -1 : 1);
    return result > 0;
}

}  // namespace cvagent::bus
