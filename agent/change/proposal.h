#pragma once

#include <string>
#include <vector>

#include "agent/change/checks.h"
#include "agent/change/meant_change.h"
#include "agent/change/rehearsal.h"

namespace cvagent::change {

enum class Already {
    leftOut,  ///< what is so already is not made
    made,
};

/// Changes beside the host as it is now; indices are those of the list.
struct Proposal {
    std::vector<MeantChange> changes;
    std::vector<Found> found;           ///< one for each
    std::vector<std::size_t> order;     ///< of those that are to be made, as they follow each other
    std::vector<Objection> objections;  ///< to those
    Already already = Already::leftOut;

    bool isToBeMade(std::size_t change) const;
};

Proposal propose(ChangedHost& host, std::vector<MeantChange> changes, const Request& request,
                 Already already = Already::leftOut);

/// In their order.
std::vector<MeantChange> toBeMade(const Proposal& proposal);

/// Why the changes should not be made, one reason a line, printable; "" when nothing speaks against them.
std::string objectionsText(const Proposal& proposal);
/// Throws Problem (refused, Problem::objection) with that text.
void refuse(const Proposal& proposal);

/// Has those that are to be made tried out, in their order. Throws CannotRehearse.
Plan rehearse(const RehearsalSettings& settings, const Proposal& proposal);

/// What a person is told before anything is done.
struct Preview {
    struct Target {
        std::string path;
        std::string property;
        std::string reason;  ///< of an objection; else ""
    };
    std::vector<Target> objections;
    std::vector<Target> unchanged;  ///< is so already
    Plan plan;                      ///< of the others
};
/// @param plan of the proposal's changes
Preview previewOf(const Proposal& proposal, Plan plan);

/// {"objections": [{"path", "property", "reason"}], "unchanged": [{"path", "property"}], "plan": {...}}
/// without a line break at its end.
std::string toJson(const Preview& preview);
/// Throws BadPlan.
Preview previewFromJson(std::string_view json);

}  // namespace cvagent::change
