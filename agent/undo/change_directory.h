#pragma once

#include <functional>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "agent/undo/journal.h"
#include "agent/undo/saved_state.h"

namespace cvagent::undo {

/// Where the changes of a host are kept, each in a directory with its number.
inline constexpr const char* kChangesPlace = "/var/lib/corvista/changes";

/// Why a change cannot be read or written down.
class ChangeError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// The numbers of all changes, ascending; none when there is no such place.
std::vector<unsigned> changesIn(const std::string& place);
/// Nothing for what is no number of a change.
std::optional<unsigned> changeNumber(std::string_view word);

/// The directory of one change. It and all in it belong to the caller alone; what is written there is on the
/// disk when the call returns, and whoever is killed leaves the old or the new. Everything throws
/// ChangeError.
class ChangeDirectory {
public:
    ChangeDirectory(const std::string& place, unsigned number);
    /// While the descriptor is open nobody else who asks for this begins a change.
    static hosttools::Descriptor lockPlace(const std::string& place);
    /// A new one, behind all that are there. The oldest ones that have ended make room.
    static ChangeDirectory make(const std::string& place);
    /// With all in it. As far as it goes.
    void remove() const;

    unsigned number() const { return number_; }
    /// Whether somebody has removed it since it was opened.
    bool isGone() const;

    /// Of a change that did not get so far: nothing.
    std::optional<Journal> journal() const;
    /// Changes the journal while nobody else does.
    /// @param change gives whether it has changed it
    /// @return what it is now
    Journal update(const std::function<bool(Journal&)>& change) const;

    /// What was saved under a name: "before", "left", "began". Nothing when there is none.
    std::optional<SavedState> load(const char* name) const;
    void save(const char* name, const SavedState& state) const;

    /// A lock that ends with the descriptor, or with the process.
    /// @return not open when somebody else has it
    hosttools::Descriptor take(const char* name) const;
    /// Waits for it.
    hosttools::Descriptor waitFor(const char* name) const;
    bool isTaken(const char* name) const;

private:
    ChangeDirectory(hosttools::Descriptor directory, unsigned number)
        : directory_(std::move(directory)), number_(number) {}

    std::optional<std::string> read(const char* name) const;
    void write(const char* name, std::string_view text) const;
    hosttools::Descriptor openLock(const char* name) const;
    hosttools::Descriptor lock(const char* name, int how) const;

    hosttools::Descriptor directory_;
    unsigned number_;
};

// The names of the locks.
inline constexpr const char* kAgentLock = "agent.lock";  ///< held by who makes the change
/// Held by him and by the commands of his steps, which may live on when he has died.
inline constexpr const char* kStepLock = "step.lock";
inline constexpr const char* kGuardLock = "guard.lock";    ///< held by the guard
inline constexpr const char* kTakingLock = "taking.lock";  ///< held by who takes the change back

}  // namespace cvagent::undo
