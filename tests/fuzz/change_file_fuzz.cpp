// Files of changes: whatever they hold, they are read or refused, and what was read is read again from what
// is written of it.
#include "agent/change/change_file.h"

#include "agent/core/text.h"
#include "tests/fuzz/lines.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    using cvagent::change::NamedChange;
    try {
        const std::vector<NamedChange> changes =
            cvagent::change::parseChanges({reinterpret_cast<const char*>(data), size});
        const std::vector<NamedChange> again =
            cvagent::change::parseChanges(cvagent::change::changeFileText(changes));
        AGREED(changes.size() == again.size());
        for (std::size_t i = 0; i < changes.size(); ++i) {
            AGREED(changes[i].node == again[i].node && changes[i].property == again[i].property);
            AGREED(changes[i].words == again[i].words && !changes[i].words.empty());
        }
    } catch (const cvagent::change::BadChangeFile& bad) {
        const std::string text = bad.what();
        AGREED(cvagent::printable(text) == text && text.size() < 1000);
    }
    return 0;
}
