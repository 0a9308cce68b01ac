#include <cstring>

#include "network/link_parse.h"
#include "tests/fuzz/lines.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::eachLine(data, size, [](const std::string& line) {
        const char* text = line.c_str();
        AGREED(IC::parse::isFullDuplex(line) == (std::strstr(text, "Full") != nullptr));
        AGREED(IC::parse::isAutoSense(line) == (std::strstr(text, "on") != nullptr));
        AGREED(IC::parse::isLinkDetected(line) == (std::strstr(text, "yes") != nullptr));
        AGREED(IC::parse::isMiiUp(line) == (std::strstr(text, "up") != nullptr));
    });
    return 0;
}
