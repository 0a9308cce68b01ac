#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "agent/bus/message.h"

namespace cvagent::bus {

/// Fills a message. Everything throws Error when the message cannot take it.
class Writer {
public:
    explicit Writer(const Message& message) : message_(message.get()) {}

    Writer& put(bool value);
    Writer& put(std::uint8_t value);
    Writer& put(std::uint16_t value);
    Writer& put(std::uint32_t value);
    Writer& put(std::int64_t value);
    Writer& put(std::uint64_t value);
    Writer& put(double value);
    /// Bytes that are no text are replaced; see asText.
    Writer& put(std::string_view text);
    Writer& put(const char* text) { return put(std::string_view(text)); }
    Writer& put(const std::vector<std::string>& texts);
    Writer& put(const std::vector<std::uint32_t>& numbers);
    Writer& putPath(const std::string& path);
    /// As "ay".
    Writer& putBytes(std::string_view bytes);

    // A container, filled by what is called with no arguments.
    template <class Fill>
    Writer& array(const char* contents, const Fill& fill) {
        return container(SD_BUS_TYPE_ARRAY, contents, fill);
    }
    template <class Fill>
    Writer& structure(const char* contents, const Fill& fill) {
        return container(SD_BUS_TYPE_STRUCT, contents, fill);
    }
    template <class Fill>
    Writer& entry(const char* contents, const Fill& fill) {
        return container(SD_BUS_TYPE_DICT_ENTRY, contents, fill);
    }
    template <class Fill>
    Writer& variant(const char* contents, const Fill& fill) {
        return container(SD_BUS_TYPE_VARIANT, contents, fill);
    }

private:
    void basic(char type, const void* value);
    void open(char type, const char* contents);
    void close();
    template <class Fill>
    Writer& container(char type, const char* contents, const Fill& fill) {
        open(type, contents);
        fill();
        close();
        return *this;
    }

    sd_bus_message* message_;
};

}  // namespace cvagent::bus
