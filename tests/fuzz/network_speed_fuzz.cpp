#include <algorithm>
#include <cctype>

#include "network/link_parse.h"
#include "tests/fuzz/lines.h"

namespace {

/// The product in arithmetic wide enough, then cut to 32 bits.
unsigned long long expected(const char* text) {
    while (std::isspace(static_cast<unsigned char>(*text)) != 0) {
        ++text;
    }
    const bool negative = *text == '-';
    text += *text == '-' || *text == '+' ? 1 : 0;
    std::int64_t number = 0;
    for (; *text >= '0' && *text <= '9'; ++text) {
        number = std::min<std::int64_t>(number * 10 + (*text - '0'), 1LL << 40);
    }
    number = std::clamp<std::int64_t>(negative ? -number : number, INT32_MIN, INT32_MAX) * 1000;
    const std::int64_t low = number & 0xFFFFFFFFLL;
    return static_cast<unsigned long long>(low >= 1LL << 31 ? low - (1LL << 32) : low);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::eachLine(data, size, [](const std::string& line) {
        AGREED(IC::parse::networkSpeed(line) == expected(line.c_str()));
        if (const auto blank = line.rfind(' '); blank != line.npos) {
            AGREED(IC::parse::networkSpeed(line.substr(blank)) == expected(line.c_str() + blank));
        }
    });
    return 0;
}
