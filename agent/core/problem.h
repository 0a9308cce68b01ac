#pragma once

#include <stdexcept>
#include <string>

namespace cvagent {

/// Why the agent could not do what it was asked. The text says what is wrong with the host, the plug-in or
/// the question; what to do next depends on the front end, which has its own words for each kind and subject.
class Problem : public std::runtime_error {
public:
    enum Kind {
        notFound,   ///< no such node or property
        ambiguous,  ///< the detail lists what could be meant
        refused,    ///< the question itself cannot be granted
        busy,       ///< another agent or another write is in the way
        timedOut,   ///< no answer until the deadline
        failed,     ///< the plug-in or the host failed
    };
    /// What a front end can give advice on.
    enum Subject {
        none,
        node,
        property,
        plan,       ///< it cannot be made here, but perhaps by somebody else
        objection,  ///< something speaks against it, but a person may know better
        pluginSearch,
        pluginFile,
        pluginLoad,
        pluginEntry,
        pluginOwner,  ///< others could put code of theirs into it
        logFile,
        currentDirectory,
        dataVariable,  ///< names no directory
        dataPlace,     ///< no directory is named and there is none by default
        dataUse,       ///< the directory cannot be made or opened
        dataOwn,       ///< a directory that another one could be named for: held (busy) or not safe
        dataFixed,     ///< the same of one that is used whatever is named
    };

    Problem(Kind kind, const std::string& text, Subject subject = none, std::string detail = {})
        : std::runtime_error(text), kind_(kind), subject_(subject), detail_(std::move(detail)) {}

    Kind kind() const { return kind_; }
    Subject subject() const { return subject_; }
    /// What belongs behind advice: the class that a property is looked for in, what could be meant, why a
    /// directory is used.
    const std::string& detail() const { return detail_; }

private:
    Kind kind_;
    Subject subject_;
    std::string detail_;
};

}  // namespace cvagent
