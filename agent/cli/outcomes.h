#pragma once

#include <string>
#include <vector>

#include "agent/cli/changes.h"

namespace cvagent {

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
};

/// "applied" and so on
const char* verdictName(Outcome::Kind kind);

/// Looks at what was written until all of it is so, and then whether it stays so, for as long as this in all.
/// What somebody changes back meanwhile is told with who may be at work there.
/// @param outcomes those of the changes, brought up to date
void verifyWithin(Session& session, const std::vector<MeantChange>& changes, std::vector<Outcome>& outcomes,
                  double seconds, const Request& request);

std::string outcomesText(const std::vector<MeantChange>& changes, const std::vector<Outcome>& outcomes);
std::string outcomesJson(const std::vector<MeantChange>& changes, const std::vector<Outcome>& outcomes);

/// Failed unless every change is so, or cannot be looked at.
ExitStatus statusOf(const std::vector<Outcome>& outcomes);

}  // namespace cvagent
