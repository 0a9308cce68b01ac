#pragma once

#include <string>
#include <vector>

#include "agent/core/data_directory.h"

namespace cvagent {

/// Opens the descriptors 0 to 2 that the program was started without (to /dev/null): the next file opened
/// would be taken for one of them. prepareSurroundings() does it, too; a program that opens or prints
/// anything before that calls it first.
void openStandardDescriptors();
/// Whether standard output was one of them: what is written there reaches nobody.
bool standardOutputWasClosed();

/// Gives the process what the plug-in's commands need, and takes from it what would let others turn them:
/// standard descriptors, an environment of a few variables, a PATH with the sbin directories behind what is
/// there, "/" as the current directory, umask 022, children that can be waited for, no core dumps, no blocked
/// signals, running timers and limits that end it in the middle of a write. To be called before any thread.
/// @param files names that become absolute, as CORVISTA_DATA_DIR does: they are meant from where the program
///              was started
void prepareSurroundings(const std::vector<std::string*>& files);

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

// What the surroundings leave out; "" when that is nothing.

/// What will be missing without root.
std::string limitsOfUser(const DataDirectory& data);

/// What does not work when nothing can be written to the data directory.
std::string limitsOfData(const DataDirectory& data);

/// What is missing when nothing can be written to /tmp, where the plug-in's commands keep their listings. To
/// be asked after a start: a listing can be what has filled it.
std::string limitsOfTmp();

}  // namespace cvagent
