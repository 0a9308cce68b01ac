#include "agent/bus/writer.h"

#include "agent/bus/text.h"

namespace cvagent::bus {

namespace {

void checkTaken(int result) {
    if (result < 0) {
        throw Error::ofErrno("the message takes no more", result);
    }
}

}  // namespace

void Writer::basic(char type, const void* value) {
    checkTaken(sd_bus_message_append_basic(message_, type, value));
}

void Writer::open(char type, const char* contents) {
    checkTaken(sd_bus_message_open_container(message_, type, contents));
}

void Writer::close() {
    checkTaken(sd_bus_message_close_container(message_));
}

Writer& Writer::put(bool value) {
    const int flag = value ? 1 : 0;
    basic(SD_BUS_TYPE_BOOLEAN, &flag);
    return *this;
}

Writer& Writer::put(std::uint8_t value) {
    basic(SD_BUS_TYPE_BYTE, &value);
    return *this;
}

Writer& Writer::put(std::uint16_t value) {
    basic(SD_BUS_TYPE_UINT16, &value);
    return *this;
}

Writer& Writer::put(std::uint32_t value) {
    basic(SD_BUS_TYPE_UINT32, &value);
    return *this;
}

Writer& Writer::put(std::int64_t value) {
    basic(SD_BUS_TYPE_INT64, &value);
    return *this;
}

Writer& Writer::put(std::uint64_t value) {
    basic(SD_BUS_TYPE_UINT64, &value);
    return *this;
}

Writer& Writer::put(double value) {
    basic(SD_BUS_TYPE_DOUBLE, &value);
    return *this;
}

Writer& Writer::put(std::string_view text) {
    const std::string kept = isText(text) ? std::string(text) : asText(text);
    basic(SD_BUS_TYPE_STRING, kept.c_str());
    return *this;
}

Writer& Writer::put(const std::vector<std::string>& texts) {
    return array("s", [&] {
        for (const std::string& text : texts) {
            put(text);
        }
    });
}

Writer& Writer::put(const std::vector<std::uint32_t>& numbers) {
    checkTaken(sd_bus_message_append_array(message_, SD_BUS_TYPE_UINT32, numbers.data(),
                                           numbers.size() * sizeof(std::uint32_t)));
    return *this;
}

Writer& Writer::putPath(const std::string& path) {
    basic(SD_BUS_TYPE_OBJECT_PATH, path.c_str());
    return *this;
}

Writer& Writer::putBytes(std::string_view bytes) {
    checkTaken(sd_bus_message_append_array(message_, SD_BUS_TYPE_BYTE, bytes.data(), bytes.size()));
    return *this;
}

}  // namespace cvagent::bus
