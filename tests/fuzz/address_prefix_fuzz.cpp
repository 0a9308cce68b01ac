#include "network/address_parse.h"
#include "tests/fuzz/lines.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::eachLine(data, size, [](const std::string& line) {
        const auto found = IC::parse::addressAndPrefix(line);
        AGREED(found.has_value() == (line.find('/') != line.npos));
        if (found) {
            AGREED(found->address.find('/') == line.npos);
            AGREED(line.starts_with(found->address + '/'));
        }
        AGREED(IC::parse::isAutoconfigured(line) == (line.find("dynamic") != line.npos));
    });
    return 0;
}
