// systemd-networkd's files.
#include "agent/keep/network_file.h"
#include "tests/fuzz/kept.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    return kept::edited(data, size, [](const std::string& text, const cvagent::keep::Wish& wish) {
        return cvagent::keep::ownNetworkFile(text, "eth0", wish);
    });
}
