#include "network/link_parse.h"
#include "tests/fuzz/lines.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::eachLine(data, size, [](const std::string& line) {
        const std::string probed = IC::parse::bondMemberToProbe(line);
        const std::string listed = IC::parse::bondMember(line);
        AGREED(probed.empty() || probed.back() != '\n');
        AGREED(listed.empty() || listed.back() != ' ');
        const auto label = line.find("Slave Interface:");
        if (label == line.npos) {
            AGREED(line.starts_with(probed));
            AGREED(probed.starts_with(listed));
        } else {
            AGREED(line.compare(label + 16, probed.size(), probed) == 0);
            AGREED(probed.empty() ? listed.empty() : probed.compare(1, listed.size(), listed) == 0);
        }
    });
    return 0;
}
