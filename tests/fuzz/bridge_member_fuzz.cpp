#include "network/link_parse.h"
#include "tests/fuzz/lines.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::eachLine(data, size, [](const std::string& line) {
        const std::string member = IC::parse::bridgeMember(line);
        AGREED(line.find(member) != line.npos);
        AGREED(member.empty() || (member.front() != '\t' && member.back() != '\n'));
        AGREED(line.starts_with('\t') || line.starts_with(' ') || line.starts_with(member));
    });
    return 0;
}
