#pragma once

#include <sys/stat.h>

#include <optional>
#include <string>
#include <tuple>
#include <vector>

namespace cvagent::shell {

/// What a tool's name leads to on PATH at this moment.
struct Program {
    enum Kind {
        missing,  ///< no directory of PATH has it
        unclear,  ///< only a shell can say: a directory that is no absolute path, a file that cannot be run
        tool,     ///< a program or script
        known,    ///< the system's own, of the implementation that the filter of that name stands for
        busybox,  ///< the same of busybox, of the release that the filters were compared with
        adapter   ///< our own host tools
    };
    Kind kind = missing;
    std::string path = {};
};

/// A file or directory by what changes when another one takes its place or something in it changes.
using FileIdentity = std::tuple<dev_t, ino_t, off_t, time_t, long, time_t, long>;

/// Looks names up as the shell does, on PATH as it is when this is made. For the stages of one pipeline, and
/// for the moment that it starts in: each directory is looked at once.
class ProgramSearch {
public:
    ProgramSearch();
    /// A name with a slash is a path.
    Program find(const std::string& name);

private:
    struct Directory {
        std::string path;
        bool looked = false;
        /// Once it was looked at, unless it has changed so lately that a further change could not be seen.
        std::optional<FileIdentity> settled;
    };

    std::optional<Program> lookIn(Directory& directory, const std::string& name);
    /// @return nothing when there is no such file
    std::optional<Program> lookAt(const std::string& name, const std::string& path);
    Program::Kind kindOf(const std::string& name, const std::string& path, const struct stat& file);

    std::vector<Directory> directories_;
};

/// Which program our own host tools are: it, or a link to it. To be told once, before anything is looked up;
/// without it none of them is recognised.
void setHostTools(const std::string& program);

}  // namespace cvagent::shell
