#pragma once

#include <string>

namespace cvagent {

/// Gives the process what the plug-in's commands need: tools that speak English, a PATH with the sbin
/// directories behind what is there, children that can be waited for.
void prepareSurroundings();

/// The agent's data directory, made (mode 0700) and locked for this process. Throws Problem (busy) when
/// another agent holds it.
class DataDirectory {
public:
    DataDirectory();
    DataDirectory(const DataDirectory&) = delete;
    DataDirectory& operator=(const DataDirectory&) = delete;
    ~DataDirectory();

    /// With a slash at its end.
    const std::string& path() const { return path_; }

private:
    std::string path_;
    int descriptor_ = -1;
};

/// While it lives, the plug-in's commands complain to nobody: not each of them sends its own complaints away,
/// and a missing file is no news. The program's own messages still reach the standard error it was started
/// with.
class QuietCommands {
public:
    QuietCommands();
    QuietCommands(const QuietCommands&) = delete;
    QuietCommands& operator=(const QuietCommands&) = delete;
    ~QuietCommands();
};

/// Where the program's own messages go.
int messageDescriptor();

// What the user is told of the surroundings; "" when there is nothing to tell.

/// What will be missing without root.
std::string hintAtRoot(const DataDirectory& data);

/// What does not work when nothing can be written to the data directory.
std::string hintAtReadOnly(const DataDirectory& data);

/// What is missing when nothing can be written to /tmp, where the plug-in's commands keep their listings. To
/// be asked after a start: a listing can be what has filled it.
std::string hintAtTemporaryFiles();

}  // namespace cvagent
