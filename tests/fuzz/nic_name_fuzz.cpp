#include "network/link_parse.h"
#include "tests/fuzz/lines.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::eachLine(data, size, [](const std::string& line) {
        const IC::parse::NICName found = IC::parse::nicName(line);
        AGREED(found.ofBridge == (line.find("br") != line.npos));
        AGREED(line.starts_with(found.name));
        AGREED(!found.name.ends_with('\n'));
        const std::string rest = line.substr(found.name.size());
        if (const auto colon = line.rfind(':'); colon != line.npos) {
            AGREED(found.name.size() <= colon && rest.find_first_not_of('\n') + found.name.size() == colon);
        } else if (found.ofBridge) {
            AGREED(found.name.find('\t') == line.npos);
        }
    });
    return 0;
}
