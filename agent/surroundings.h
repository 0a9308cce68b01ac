#pragma once

#include "agent/data_directory.h"
#include "agent/options.h"

namespace cvagent {

/// Opens the descriptors 0 to 2 that the program was started without (to /dev/null): the next file opened
/// would be taken for one of them. To be called before anything else.
void openStandardDescriptors();

/// Gives the process what the plug-in's commands need, and takes from it what would let others turn them: an
/// environment of a few variables, a PATH with the sbin directories behind what is there, "/" as the current
/// directory, umask 022, children that can be waited for, no core dumps, no blocked signals, running timers
/// and limits that end it in the middle of a write. To be called before any thread.
/// @param options the names of files in it become absolute: they are meant from where the program was
///                started, as is CORVISTA_DATA_DIR
void prepareSurroundings(Options& options);

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
