#pragma once

#include <chrono>
#include <optional>
#include <string>

#include "agent/core/own_directory.h"

namespace cvagent {

/// Names another data directory.
inline constexpr const char* kDataVariable = "CORVISTA_DATA_DIR";

/// Where a user who may not write to the standard place keeps the data; "" when there is no home.
std::string userDirectory();

/// A directory held by a lock file in it that only its owner can open. The directory belongs to the caller,
/// the way to it to the caller or to root, and nobody else can write there (see owners.h); what is missing is
/// made, the last directory with mode 0700. Where nothing can be written (EROFS) there is nothing to hold.
class HeldDirectory {
public:
    /// Throws Problem when somebody else could change the directory and, as `busy`, when another agent holds
    /// it; std::system_error when it cannot be made or opened.
    /// @param wait how long another one may go on holding it
    HeldDirectory(const std::string& path, const DirectoryRole& role,
                  std::chrono::milliseconds wait = std::chrono::milliseconds(0));
    HeldDirectory(const HeldDirectory&) = delete;
    HeldDirectory& operator=(const HeldDirectory&) = delete;
    ~HeldDirectory();

    /// Without symbolic links, with a slash at its end.
    const std::string& path() const { return path_; }

private:
    void hold(const DirectoryRole& role, std::chrono::milliseconds wait) const;

    std::string path_;
    int lock_;
};

/// The agent's data directory and, whatever that is, one that all agents of the user hold, for the names of
/// the plug-in's files in /tmp and of the saved settings of interfaces are fixed: where these are saved, or
/// the user's own standard directory where that is not the caller's. Both are held for this process.
class DataDirectory {
public:
    /// Throws Problem; busy when another agent holds one of them.
    /// @param wait how long it may go on holding it
    explicit DataDirectory(std::chrono::milliseconds wait = std::chrono::milliseconds(0));

    /// Has the plug-ins find it. To be called before any thread.
    void nameInEnvironment() const;
    /// With a slash at its end.
    const std::string& path() const { return own_->path(); }

private:
    void holdSettings(std::chrono::milliseconds wait);

    bool isStandard_ = false;  ///< the one that plug-ins use where none is named
    std::optional<HeldDirectory> own_;
    std::optional<HeldDirectory> settings_;
};

}  // namespace cvagent
