#pragma once

#include <string>

#include "agent/core/text.h"
#include "agent/keep/wish.h"
#include "tests/fuzz/lines.h"

/// Files of the systems that keep interfaces: whatever they hold, they are edited or refused in words, and
/// what was edited is as wanted.
namespace kept {

/// Which wish is meant is told by the first byte.
inline cvagent::keep::Wish wish(unsigned char which) {
    cvagent::keep::Wish wish;
    if ((which & 1U) != 0) {
        wish.dhcp = (which & 2U) != 0;
    }
    if ((which & 4U) != 0) {
        wish.ipv4.address = "192.0.2.77";
    }
    if ((which & 8U) != 0) {
        wish.ipv4.prefix = 25;
    }
    if ((which & 16U) != 0) {
        wish.ipv4.gateway = "192.0.2.1";
    }
    if ((which & 32U) != 0) {
        wish.ipv6.address = "2001:db8::77";
        wish.ipv6.prefix = 48;
    }
    if ((which & 64U) != 0) {
        wish.nameServers = std::vector<std::string>{"192.0.2.53"};
    }
    if ((which & 128U) != 0) {
        wish.searchDomains = std::vector<std::string>{"example.org", "example.net"};
    }
    return wish;
}

/// @param edit of a text and a wish; a second time it has nothing more to change
template <class Edit>
int edited(const std::uint8_t* data, std::size_t size, const Edit& edit) {
    if (size == 0) {
        return 0;
    }
    const cvagent::keep::Wish wanted = wish(data[0]);
    const std::string text(reinterpret_cast<const char*>(data) + 1, size - 1);
    std::string once;
    try {
        once = edit(text, wanted);
    } catch (const cvagent::keep::CannotKeep& cannot) {
        const std::string why = cannot.what();
        AGREED(!why.empty() && cvagent::printable(why) == why);
        return 0;
    }
    AGREED(edit(once, wanted) == once);
    return 0;
}

}  // namespace kept
