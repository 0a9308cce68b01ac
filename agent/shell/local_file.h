#pragma once

#include <sys/types.h>

#include <string>

#include "hosttools/descriptor.h"

namespace cvagent::shell {

/// What became of a file that one of our own threads was to open. Such a thread cannot be killed, so it opens
/// only what cannot hold it: regular files on this machine's own file systems and files of /proc.
struct LocalFile {
    enum Outcome {
        opened,
        large,    ///< larger than is wanted
        missing,  ///< there is none, it may not be read or is a directory: a tool has nothing of it either
        unfit     ///< anything else: for a tool, which can be killed
    };
    Outcome outcome = unfit;
    hosttools::Descriptor descriptor = {};
};

/// @param path from the root directory on
/// @param most bytes that it may have
LocalFile openForReading(const std::string& path, off_t most);
/// Opens as a shell does for `>` and `>>`. Whatever goes wrong is `unfit`: a shell then says so.
LocalFile openForWriting(const std::string& path, bool append);
/// Whether a path names a file or link that can be removed at once.
LocalFile::Outcome removable(const std::string& path);

}  // namespace cvagent::shell
