#pragma once

#include <sys/types.h>

#include <string>

namespace cvagent {

/// Where a history is kept.
struct HistoryPlace {
    std::string directory;  ///< whole path with a slash at its end
    /// The host's own, which the members of a group may read where the host has that group.
    bool isHosts = false;

    std::string file() const { return directory + "history.db"; }
};

/// Where the agents of this user keep what happens: of root the host's place, of others, and where a data
/// directory is named, the data directory. Throws HistoryError when there is no place.
HistoryPlace ownHistoryPlace();
/// What this user would read: the host's history, or his own where there is none of the host or none that he
/// may read, or where a data directory is named.
/// @param left says why the host's history is left out, if it is
HistoryPlace readHistoryPlace(std::string& left);

/// Which file has a name; it is another one after somebody has moved it.
struct FileIdentity {
    dev_t device = 0;
    ino_t inode = 0;
    bool operator==(const FileIdentity&) const = default;
};
/// Of a file that is not there it is like that of no other.
FileIdentity identityOf(const std::string& file);

/// Makes the directory where it is missing, and looks whether it is the caller's alone. Throws HistoryError.
/// @return the place without symbolic links
HistoryPlace reachHistoryPlace(HistoryPlace place);
/// The same for the file. To be done under the lock (alone).
void prepareHistoryFile(const HistoryPlace& place);
/// Throws HistoryError when a file that is to be read is missing or could be another user's work.
/// @return the place without symbolic links
HistoryPlace judgeForReading(HistoryPlace place);

/// Gives the file, and what belongs to it, a name that says that it is damaged. @return that name
std::string moveAside(const HistoryPlace& place);
/// Whether there was a file before, though perhaps nothing is left in it: what went with it lies there, or one
/// that was moved aside.
bool hasTraces(const HistoryPlace& place);

/// Held while the file under the name is written (shared), or made, changed in form or moved (alone).
class HistoryLock {
public:
    enum class Kind { shared, alone };

    /// Throws HistoryError; busy when others hold it all the time.
    HistoryLock(const HistoryPlace& place, Kind kind);
    HistoryLock(const HistoryLock&) = delete;
    HistoryLock& operator=(const HistoryLock&) = delete;
    ~HistoryLock();

private:
    int file_;
};

}  // namespace cvagent
