#pragma once

#include <functional>
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

/// What a daemon is asked to do with a file of its own.
struct Request {
    std::vector<std::string> words;   ///< for people, a line each
    std::function<void()> make;       ///< throws CannotKeep; NotBegun where there is nothing to take back
    std::function<void()> readAgain;  ///< when the file has come back; throws CannotKeep
};

/// How a system is made to keep something. Nothing of it is done yet, so that it can be shown.
struct Way {
    std::string system;
    std::vector<std::string> callsBefore;  ///< command lines
    std::vector<FileEdit> files;
    std::vector<std::string> callsAfter;
    std::optional<Request> request{};  ///< instead of the calls behind; those are for who cannot ask
    /// The calls are for more than these files: they are made even when no file has to be changed.
    bool isAlwaysTold = false;

    /// Nothing has to be changed: it is kept already.
    bool isEmpty() const;
    /// The way back: the same calls, and the files as they were byte for byte.
    Way back() const;
};

// One function a system: how it would keep the wish. Throws CannotKeep.
Way wayOfNetworkManager(const Link& link, const Claim& claim, const Wish& wish);
Way wayOfNetplan(const Link& link, const Claim& claim, const Wish& wish);
Way wayOfNetworkd(const Link& link, const Claim& claim, const Wish& wish);
Way wayOfWicked(const Link& link, const Claim& claim, const Wish& wish);
Way wayOfIfupdown(const Link& link, const Claim& claim, const Wish& wish);

/// The same of the system that keeps the link. For an empty wish: the files that any other could change, as
/// they are, and the calls. Throws CannotKeep, also when nobody keeps it and when it is not
/// known who does.
Way wayToKeep(const Link& link, const Keeper& keeper, const Wish& wish);

/// Goes the way: each file is compared with what it was, replaced whole and read again; one that the calls
/// before have changed as wanted is left. Where a step fails, all that was done is taken back. Throws
/// CannotKeep, which tells of both.
void go(const Way& way);

}  // namespace cvagent::keep
