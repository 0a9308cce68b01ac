#pragma once

#include <optional>
#include <string>
#include <vector>

#include "agent/keep/keeper.h"
#include "agent/keep/wish.h"

namespace cvagent::keep {

struct FileEdit {
    std::string path;
    std::optional<std::string> before;  ///< nothing: there is none
    std::optional<std::string> after;   ///< the same
    std::string like{};                 ///< a file whose owner and mode one gets that is not there yet

    bool isChange() const { return before != after; }
};

/// How a system is made to keep something. Nothing of it is done yet, so that it can be shown.
struct Way {
    std::string system;
    std::vector<std::string> callsBefore;  ///< command lines
    std::vector<FileEdit> files;
    std::vector<std::string> callsAfter;
    /// The calls are for more than these files: they are made even when no file has to be changed.
    bool isAlwaysTold = false;

    /// Nothing has to be changed: it is kept already.
    bool isEmpty() const;
    /// The way back: the same calls, and the files as they were byte for byte.
    Way back() const;
};

// One function a system: how it would keep the wish. Throws CannotKeep.
Way wayOfNetplan(const Link& link, const Claim& claim, const Wish& wish);
Way wayOfNetworkd(const Link& link, const Claim& claim, const Wish& wish);
Way wayOfWicked(const Link& link, const Claim& claim, const Wish& wish);
Way wayOfIfupdown(const Link& link, const Claim& claim, const Wish& wish);

/// The same of the system that keeps the link. For an empty wish: the files that any other could change, as
/// they are, and the calls. Throws CannotKeep, also when nobody keeps it, when it is not
/// known who does, and for a system that is not asked to keep anything.
Way wayToKeep(const Link& link, const Keeper& keeper, const Wish& wish);

/// Goes the way: each file is compared with what it was, replaced whole and read again; one that the calls
/// before have changed as wanted is left. Where a step fails, all that was done is taken back. Throws
/// CannotKeep, which tells of both.
void go(const Way& way);

}  // namespace cvagent::keep
