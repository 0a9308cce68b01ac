#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "agent/undo/file_state.h"
#include "agent/undo/keeper_calls.h"
#include "agent/undo/network_restore.h"

namespace cvagent::undo {

/// A host at one moment, as far as a change touches it.
struct SavedState {
    std::vector<FileState> files;
    bool hasNetwork = true;  ///< false: the change does not touch it, and nothing of it is saved
    NetworkState network;
    KeeperCalls calls;  ///< to be run when its files come back
    std::string hostName;
    std::string domainName;
    std::string boot;                ///< which start of the host it is of; "" where nobody knows
    std::uint64_t milliseconds = 0;  ///< of the boot clock

    /// @param paths whole; each once
    static SavedState of(const std::vector<std::string>& paths, bool hasNetwork = true);
    /// The same of the host, now.
    SavedState again() const;
    /// Whether it is the same, as far as it can be put back, whenever its files were written.
    bool isAs(const SavedState& other) const;

    std::vector<std::string> paths() const;
    /// Why a change of this cannot be taken back; "" when it can.
    std::string obstacle() const;
};

std::string textOf(const SavedState& state);
/// Throws BadRecord.
SavedState savedStateFrom(std::string_view text);

/// What has been found out, done and left.
struct TakenBack {
    std::vector<std::string> notes;  ///< what is not put back, in sentences
};

/// Takes a change back. Depends on the arguments and what is so now alone, and can be done again with the
/// same ones when it did not come to its end. The kernel's state only in the start of the host that it is of.
/// @param left what the change left; null when it did not come to its end
/// @param began the host when the taking back began for the first time
TakenBack takeBack(const SavedState& before, const SavedState* left, const SavedState& began);

}  // namespace cvagent::undo
