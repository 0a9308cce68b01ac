#include "network/port_type.h"
#include "tests/fuzz/lines.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::eachLine(data, size, [](const std::string& line) {
        const unsigned int code = IC::getPortType(line.c_str());
        AGREED(code != 102);
        AGREED(code <= 111 || code == 16000);
        AGREED(line.size() >= 5 || code == 0);
    });
    return 0;
}
