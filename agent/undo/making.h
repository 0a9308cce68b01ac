#pragma once

#include <functional>

#include "agent/undo/change_directory.h"

namespace cvagent::undo {

struct MakingSettings {
    std::string place = kChangesPlace;
    std::string caller;
    std::string summary;             ///< what is changed, in a line
    std::vector<std::string> paths;  ///< whole ones of all files that it may touch
    bool hasNetwork = true;          ///< whether it may touch the kernel's network
    KeeperCalls calls;               ///< see there; its files are among the paths
    std::uint64_t steps = 0;
    std::uint64_t settling = 0;  ///< see Journal
    std::uint64_t window = 0;    ///< milliseconds for the confirmation; 0: nobody waits for one
};

/// A change while it is made: everything that it touches is saved before its first step, and each step is
/// written down before it begins. Who is killed meanwhile, or gives up, has it taken back by the guard.
class ChangeInMaking {
public:
    /// Saves everything. Throws ChangeError when that cannot be, or another change waits for its
    /// confirmation.
    explicit ChangeInMaking(const MakingSettings& settings);

    unsigned number() const { return directory_.number(); }
    const ChangeDirectory& directory() const { return directory_; }

    /// Throws ChangeError when the change is being taken back, for its time is over.
    void beginStep();
    /// All steps are made. From now on the time for the confirmation counts; without one the change is kept.
    /// Then one that has left everything as it was is forgotten.
    Journal end();
    /// A step has failed.
    Journal takeBack();
    /// Nothing of it is known any more.
    void forget();

private:
    void save(const MakingSettings& settings);
    Journal update(const std::function<bool(Journal&)>& change);

    hosttools::Descriptor place_;  ///< locked until the others can see that this one has begun
    ChangeDirectory directory_;
    hosttools::Descriptor alive_;
    hosttools::Descriptor inSteps_;
    SavedState before_;
    Journal begun_;  ///< as the journal begins
    std::uint64_t window_;
};

// What people ask for, from whatever connection. Each throws ChangeError when it cannot be.

/// Keeps what waits for its confirmation. Neither this nor more time helps when the time is over.
void confirmChange(const ChangeDirectory& change);
/// Gives it so much time from now on.
void lengthenChange(const ChangeDirectory& change, std::uint64_t milliseconds);
/// Takes a change back that was kept, or that waits. Not when a newer one stands on it.
Journal rollBack(const std::string& place, const ChangeDirectory& change);
/// The last change that can be taken back.
std::optional<unsigned> lastStanding(const std::string& place);

}  // namespace cvagent::undo
