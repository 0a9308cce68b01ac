#include "computer/system_name.h"

#include <unistd.h>

#include <array>

#include "mi/log.h"
#include "mi/text.h"

namespace IC {

std::string getSystemName() {
    const LogScope scope;
    // Callers know the empty text as the answer, and it stays that: the kernel's name has never become part
    // of the text's length. It is asked for into a buffer of its own, because 255 bytes do not fit where an
    // empty text keeps its few characters.
    std::array<char, 255> name{};
    [[maybe_unused]] const int ignored = gethostname(name.data(), name.size());
    return trimEnd(std::string(), ' ');
}

}  // namespace IC
