#include "computer/system_data.h"

#include <unistd.h>

#include <array>
#include <cstring>

#include "computer/computer_builder.h"
#include "mi/command.h"
#include "mi/log.h"

namespace IC {

namespace {

constexpr unsigned int kPlainLength = 9;
constexpr int kDottedLength = 13;

/// The separator that stands before an input position; NUL for none.
constexpr char separatorBefore(unsigned int position) {
    switch (position) {
        case 2:
        case 8:
            return '-';
        case 4:
        case 6:
            return '.';
        default:
            return '\0';
    }
}

/// Copies the characters and the zero behind them: 14 bytes.
void writeDotted(const char* plain, char* dotted) {
    for (unsigned int position = 0; position <= kPlainLength; ++position) {
        if (const char separator = separatorBefore(position); separator != '\0') {
            *dotted++ = separator;
        }
        *dotted++ = plain[position];
    }
}

}  // namespace

int formatHostFirmwareVersion(char* ver_in, unsigned int size_ver_in, char* ver_out, int size_ver_out) {
    const LogScope scope;
    if (size_ver_in != kPlainLength) {
        log(kError) << "size_ver_in != 9";
        return 1;
    }
    if (size_ver_out < kDottedLength) {
        log(kError) << "size_ver_out < 13";
        return 1;
    }
    writeDotted(ver_in, ver_out);
    // Looks at the bytes written and no further: the tenth input byte need not have been a zero.
    if (strnlen(ver_out, kDottedLength + 1) != kDottedLength) {
        log(kError) << "13 != strlen(ver_out)";
        return 1;
    }
    return 0;
}

std::string getSystemName() {
    const LogScope scope;
    // Callers know the empty text as the answer, and it stays that: the kernel's name has never become part
    // of the text's length. It is asked for into a buffer of its own, because 255 bytes do not fit where an
    // empty text keeps its few characters.
    std::array<char, 255> name{};
    [[maybe_unused]] const int ignored = gethostname(name.data(), name.size());
    return {};
}

/// Refreshes the system's vital-product-data database. Hosts have one of the two tools, or none.
void ComputerBuilder::vpdUpdate() {
    const LogScope scope;
    for (const Command& tool :
         {Command("/usr/sbin/vpdupdate 2> /dev/null"), Command("/sbin/update-lsvpd-db 2> /dev/null")}) {
        const HostCommand run(tool);
    }
}

}  // namespace IC
