// ifupdown's files.
#include "agent/keep/stanza_editor.h"
#include "tests/fuzz/kept.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    return kept::edited(data, size, [](const std::string& text, const cvagent::keep::Wish& wish) {
        return cvagent::keep::editedStanza(text, "eth0", wish);
    });
}
