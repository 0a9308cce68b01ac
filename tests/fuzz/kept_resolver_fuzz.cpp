// What the C library reads of name servers and search domains, and what systemd-resolved does.
#include "agent/keep/resolver_file.h"
#include "tests/fuzz/kept.h"

namespace {

using Texts = std::vector<std::string>;

std::string inBoth(const std::string& text, const cvagent::keep::Wish& wish) {
    const std::string edited = cvagent::keep::editedResolvedDropIn(text, wish);
    return wish.nameServers
               ? cvagent::keep::editedResolverLines(edited, "nameserver", {"nameserver 192.0.2.53"})
               : edited;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string text(reinterpret_cast<const char*>(data), size);
    const auto lists = cvagent::keep::resolverListsIn(
        cvagent::keep::editedResolverLines(text, "nameserver", {"nameserver ::1"}));
    AGREED(lists.nameServers == Texts{"::1"});
    return kept::edited(data, size, inBoth);
}
