#include "plugins/hardware/storage/mounts.h"

#include <sstream>

namespace hardware {

namespace {

/// "\040" as the kernel writes blanks, tabs, line breaks and backslashes.
std::string decodedOctal(const std::string& text) {
    std::string plain;
    for (std::size_t at = 0; at < text.size(); ++at) {
        const bool coded =
            text[at] == '\\' && at + 3 < text.size() && text.find_first_not_of("01234567", at + 1) >= at + 4;
        if (coded) {
            plain +=
                static_cast<char>((text[at + 1] - '0') * 64 + (text[at + 2] - '0') * 8 + text[at + 3] - '0');
            at += 3;
        } else {
            plain += text[at];
        }
    }
    return plain;
}

}  // namespace

std::vector<Mount> mounts(const Host& host) {
    std::vector<Mount> all;
    // Those of the first process: the agent sees mounts of its own besides.
    std::vector<std::string> lines = host.lines("/proc/1/mountinfo");
    if (lines.empty()) {
        lines = host.lines("/proc/self/mountinfo");
    }
    for (const std::string& line : lines) {
        const std::size_t dash = line.find(" - ");
        if (dash == std::string::npos) {
            continue;
        }
        std::istringstream place(line.substr(0, dash));
        std::istringstream what(line.substr(dash + 3));
        std::string ignored;
        Mount mount;
        if (place >> ignored >> ignored >> mount.number >> ignored >> mount.where &&
            what >> mount.type >> mount.source) {
            mount.where = decodedOctal(mount.where);
            mount.source = decodedOctal(mount.source);
            all.push_back(mount);
        }
    }
    return all;
}

}  // namespace hardware
