#include <cstring>

#include "network/address_parse.h"
#include "tests/fuzz/lines.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::eachLine(data, size, [](const std::string& line) {
        // The C library's own splitting says the same.
        std::string fields = line;
        char* rest = nullptr;
        const char* second =
            strtok_r(fields.data(), " ", &rest) == nullptr ? nullptr : strtok_r(nullptr, " ", &rest);
        const auto gateway = IC::parse::gatewayField(line);
        AGREED(gateway.has_value() == (second != nullptr));
        if (gateway) {
            AGREED(std::string_view(second).starts_with(*gateway));
            AGREED(std::string_view(second).find_first_not_of('\n', gateway->size()) ==
                   std::string_view::npos);
        }
    });
    return 0;
}
