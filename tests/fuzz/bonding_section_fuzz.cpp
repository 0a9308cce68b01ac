#include "network/bonding_status.h"
#include "tests/fuzz/lines.h"

namespace {

bool isOneWord(const std::string& text) {
    return text.find_first_of(" \n") == text.npos;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string label = "Slave Interface: ";
    std::vector<std::string> lines;
    fuzz::eachLine(data, size, [&](const std::string& line) { lines.push_back(line); });
    AGREED(!IC::parse::bondingMember(lines, "eth0\n"));
    for (const std::string& line : lines) {
        const std::string text = line.substr(0, line.find_last_not_of('\n') + 1);
        if (!text.starts_with(label)) {
            continue;
        }
        const auto member = IC::parse::bondingMember(lines, text.substr(label.size()));
        AGREED(member.has_value());
        AGREED(isOneWord(member->miiStatus));
        AGREED(isOneWord(member->linkFailures));
    }
    return 0;
}
