// Saved states and journals: whatever they hold, they are read or refused, and what was read is read again
// from what is written of it.
#include "agent/undo/journal.h"
#include "agent/undo/saved_state.h"
#include "tests/fuzz/lines.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    namespace undo = cvagent::undo;
    const std::string_view text(reinterpret_cast<const char*>(data), size);
    try {
        const std::string once = undo::textOf(undo::savedStateFrom(text));
        AGREED(undo::textOf(undo::savedStateFrom(once)) == once);
    } catch (const undo::BadRecord&) {
    }
    try {
        const std::string once = undo::textOf(undo::journalFrom(text));
        AGREED(undo::textOf(undo::journalFrom(once)) == once);
    } catch (const undo::BadRecord&) {
    }
    return 0;
}
