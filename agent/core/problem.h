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
        ambiguous,  ///< the text lists what could be meant
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
        pluginSearch,
        pluginFile,
        pluginLoad,
        pluginEntry,
        logFile,
        environment
    };

    Problem(Kind kind, const std::string& text, Subject subject = none, std::string nodeClass = {})
        : std::runtime_error(text), kind_(kind), subject_(subject), nodeClass_(std::move(nodeClass)) {}

    Kind kind() const { return kind_; }
    Subject subject() const { return subject_; }
    /// The class of nodes that a problem with a property is about.
    const std::string& nodeClass() const { return nodeClass_; }

private:
    Kind kind_;
    Subject subject_;
    std::string nodeClass_;
};

}  // namespace cvagent
