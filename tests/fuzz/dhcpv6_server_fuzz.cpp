#include "network/address_parse.h"
#include "tests/fuzz/lines.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::eachLine(data, size, [](const std::string& line) {
        const std::string server = IC::parse::dhcpv6Server(line);
        AGREED(line.starts_with(server));
        AGREED(!server.ends_with(';'));
        AGREED(line.find_first_not_of(";\n", server.size()) == line.npos);
    });
    return 0;
}
