#pragma once

#include <atomic>

namespace IC {

/// A file in /tmp that a command writes and others read. Any user of the host knows its name and may have put
/// something else there first: a link to a file that only we may write, a pipe, lines of his own.
class TemporaryFile {
public:
    /// @param path kept, not copied
    constexpr explicit TemporaryFile(const char* path) : path_(path) {}

    /// Removes what stands there, be it an empty directory, and creates an empty file that our user alone can
    /// read and write; no link is followed. Where others cannot remove our files, as in every /tmp with its
    /// sticky bit, the command that is started next writes into this very file.
    /// @return false when something could not be removed or the file not created: the command must not run
    bool removeAndCreate();

    /// Whether what stands there may be read: a regular file of our user's, without a second link, that
    /// nobody else can write. Not after a removeAndCreate that failed: then it is an earlier run's.
    bool isOurs() const;

private:
    const char* const path_;
    std::atomic<bool> isLeftOver_{false};
};

}  // namespace IC
