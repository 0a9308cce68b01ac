#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "agent/bus/message.h"

namespace cvagent::bus {

/// Reads a message from its beginning. Everything throws Error (InvalidArgs) when something else is there.
class Reader {
public:
    explicit Reader(const Message& message);

    bool flag();
    std::uint8_t byte();
    std::uint32_t number();
    std::uint64_t longNumber();
    double real();
    std::string text();
    std::string path();
    std::vector<std::string> texts();
    std::vector<std::uint32_t> numbers();
    std::string bytes();
    /// A basic value of any type that is one: "s", "o", "g" as they are, flags "1" and "0", numbers in
    /// decimal.
    std::string asWord();

    /// Calls something for each element.
    template <class Each>
    void array(const char* contents, const Each& each) {
        enter(SD_BUS_TYPE_ARRAY, contents);
        while (!atEnd()) {
            each();
        }
        leave();
    }
    template <class Take>
    void structure(const char* contents, const Take& take) {
        within(SD_BUS_TYPE_STRUCT, contents, take);
    }
    template <class Take>
    void entry(const char* contents, const Take& take) {
        within(SD_BUS_TYPE_DICT_ENTRY, contents, take);
    }
    /// Calls something with the type of what the variant holds.
    template <class Take>
    void variant(const Take& take) {
        const std::string contents = variantType();
        within(SD_BUS_TYPE_VARIANT, contents.c_str(), [&] { take(contents); });
    }
    void skip();
    bool atEnd();

private:
    template <class Value>
    bool takeAs(char type, char wanted, std::string& word);
    void basic(char type, void* value);
    void enter(char type, const char* contents);
    void leave();
    std::string variantType();
    template <class Take>
    void within(char type, const char* contents, const Take& take) {
        enter(type, contents);
        take();
        leave();
    }

    sd_bus_message* message_;
};

}  // namespace cvagent::bus
