#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "agent/shell/filters/filters.h"

namespace cvagent::shell {

/// What a line is searched for: texts in which any letter may stand at some places, at the line's begin or
/// end if it says so. That is less than what grep knows.
class Pattern {
public:
    /// @return nothing for a pattern that is more than that
    static std::optional<Pattern> read(std::string_view text, Dialect dialect, bool ignoreCase,
                                       bool wholeWord);

    bool isIn(std::string_view line) const;

private:
    struct Alternative {
        std::string text;
        std::vector<bool> any;  ///< the places that fit any letter
        bool plain = true;      ///< there are none
        bool atBegin = false;
        bool atEnd = false;
    };

    static std::optional<Alternative> readAlternative(std::string_view text, Dialect dialect);
    bool fits(const Alternative& wanted, std::string_view line, std::size_t place) const;
    bool isIn(const Alternative& wanted, std::string_view line) const;
    bool standsAlone(std::string_view line, std::size_t place, std::size_t length) const;

    std::vector<Alternative> alternatives_;
    bool ignoreCase_ = false;
    bool wholeWord_ = false;
};

}  // namespace cvagent::shell
