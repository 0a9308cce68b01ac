#pragma once

#include <string>
#include <string_view>

namespace cvagent::shell {

/// What a tool's name leads to on PATH at this moment.
struct Program {
    enum Kind {
        missing,  ///< no directory of PATH has it
        unclear,  ///< only a shell can say: a directory that is no absolute path, a file that cannot be run
        tool,     ///< a program or script
        known,    ///< the system's own, of the implementation that the filter of that name stands for
        adapter   ///< our own host tools
    };
    Kind kind = missing;
    std::string path = {};
};

/// Looks a name up as the shell does. A name with a slash is a path.
Program findProgram(const std::string& name);

/// Which program our own host tools are: it, or a link to it. To be told once, before anything is looked up;
/// without it none of them is recognised.
void setHostTools(const std::string& program);

}  // namespace cvagent::shell
