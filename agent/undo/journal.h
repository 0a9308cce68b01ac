#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace cvagent::undo {

/// How far a change has come, in this order; it ends with `kept`, `takenBack` or `failed`.
enum class Stage {
    saved,       ///< nothing has been changed yet
    changing,    ///< a step is under way, or the next one comes
    made,        ///< it waits for its confirmation
    kept,        ///< it was confirmed, or nobody was to confirm it
    takingBack,  ///< it is being taken back, or is to be
    takenBack,   ///< as far as the notes do not say otherwise
    failed,      ///< it cannot be taken back: what was saved cannot be read
};

/// What stands behind "the change": "waits for its confirmation" and so on
const char* stageText(Stage stage);

/// What is written down of a change before each of its steps.
struct Journal {
    Stage stage = Stage::saved;
    std::string boot;            ///< which start of the host the deadline is of
    std::uint64_t window = 0;    ///< milliseconds for the confirmation; 0: nobody waits for one
    std::uint64_t deadline = 0;  ///< by the boot clock, in milliseconds
    /// Milliseconds for which a step may go on when who makes the change has died, for others do the work.
    std::uint64_t settling = 0;
    std::uint64_t step = 0;  ///< that has begun, from 1
    std::uint64_t steps = 0;
    std::uint64_t began = 0;  ///< seconds since 1970, for people
    std::string caller;
    std::string summary;             ///< what is changed, in a line
    std::vector<std::string> notes;  ///< what could not be taken back

    bool isEnded() const {
        return stage == Stage::kept || stage == Stage::takenBack || stage == Stage::failed;
    }
    /// Whether it waits for a confirmation, or will, or is not back yet: until then none begins beside it.
    bool isOpen() const {
        const bool isMade = stage == Stage::changing || stage == Stage::made;
        return stage == Stage::takingBack || (isMade && window != 0);
    }
    /// Whether its time is over, by a clock that nobody can set. A new start of the host ends all time.
    bool isDue() const;
};

std::string textOf(const Journal& journal);
/// Throws BadRecord.
Journal journalFrom(std::string_view text);

/// The longest time that somebody can have for the confirmation.
inline constexpr std::uint64_t kLongestWindow = 86'400'000;

}  // namespace cvagent::undo
