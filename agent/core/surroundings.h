#pragma once

#include <string>

namespace cvagent {

/// Gives the process what the plug-in's commands need: tools that speak English, a PATH with the sbin
/// directories behind what is there, children that can be waited for.
void prepareSurroundings();

/// The agent's data directory, made (mode 0700) and locked for this process. Throws Failure (busy) when
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

/// Without root: tells on standard error what will be missing. With root nothing.
void hintAtRoot(const DataDirectory& data);

/// Tells on standard error what does not work when nothing can be written to the data directory.
void hintAtReadOnly(const DataDirectory& data);

/// Tells on standard error what is missing when nothing can be written to /tmp, where the plug-in's commands
/// keep their listings. To be asked after a start: a listing can be what has filled it.
void hintAtTemporaryFiles();

}  // namespace cvagent
