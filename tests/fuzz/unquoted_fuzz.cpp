#include <algorithm>

#include "network/address_parse.h"
#include "tests/fuzz/lines.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::eachLine(data, size, [](const std::string& line) {
        const std::string value = IC::parse::unquoted(line);
        AGREED(value.find_first_of("'\"") == value.npos);
        const auto quotes =
            std::count(line.begin(), line.end(), '\'') + std::count(line.begin(), line.end(), '"');
        const std::size_t lineBreaks = line.size() - (line.find_last_not_of('\n') + 1);
        AGREED(value.size() == line.size() - lineBreaks - static_cast<std::size_t>(quotes));
    });
    return 0;
}
