#include "network/address_parse.h"
#include "tests/fuzz/lines.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::eachLine(data, size, [](const std::string& line) {
        AGREED(IC::parse::addressKind(line) == (line == "Link" ? 6U : 5U));
    });
    return 0;
}
