#pragma once

#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "agent/change/meant_change.h"

namespace cvagent::change {

/// What became of a change.
struct Outcome {
    enum Kind {
        unchanged,  ///< it was so already
        applied,
        differs,
        notKnown,
        failed,
        notMade,  ///< since one before it failed
    };
    Kind kind = notMade;
    std::string reason;  ///< printable; "" where there is nothing to say
    Reading before;
    Reading after;
    std::vector<std::string> notes;
    // Of the write itself; see WriteResult.
    bool complained = false;
    std::string lacking;
    std::optional<Problem> problem;
};

/// "applied" and so on
const char* verdictName(Outcome::Kind kind);
/// Nothing for any other name.
std::optional<Outcome::Kind> verdictNamed(const std::string& name);

Outcome::Kind kindOf(WriteResult::Outcome outcome);

/// How long apply looks whether a change comes about and stays.
inline constexpr double kVerifySeconds = 3;

/// Looks at what was written until all of it is so, and then whether it stays so, for as long as this in all.
/// What somebody changes back meanwhile is told with who may be at work there.
/// @param outcomes those of the changes, brought up to date
/// @param goesOn asked between two looks; null: always
void verifyWithin(ChangedHost& host, const std::vector<MeantChange>& changes, std::vector<Outcome>& outcomes,
                  double seconds, const Request& request, const std::function<bool()>& goesOn = nullptr);

}  // namespace cvagent::change
