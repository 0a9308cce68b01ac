#pragma once

#include <memory>
#include <string>
#include <vector>

#include "hosttools/descriptor.h"

namespace cvagent::change {

/// A directory, or a mounted file, of the host that was covered: what is written there goes elsewhere.
struct Cover {
    enum class Kind {
        overlay,  ///< ours holds what is other than in the original
        copy,     ///< ours is a whole copy of a directory
        file      ///< ours is a copy of one file
    };
    std::string path;
    Kind kind = Kind::overlay;
    hosttools::Descriptor original;
    hosttools::Descriptor ours;
};

/// The host's files as the process sees them from here on: read-only, without devices, with a process table
/// of its own, and covered where a plug-in's writers write: /etc, /run, /tmp, the data directories, the
/// directories that links in /etc lead to, and what is mounted below any of them. Of /run the sockets and
/// pipes of daemons are gone. To be called in mounts of its own, single-threaded, before the fence.
/// @param copies as a user: what is not his own cannot be written through an overlay
/// @param dataDirectory besides the place that is always used; "": none
/// Throws Cannot.
std::vector<Cover> isolateFiles(bool copies, const std::string& dataDirectory);

}  // namespace cvagent::change
