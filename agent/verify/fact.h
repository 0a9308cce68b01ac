#pragma once

#include <optional>
#include <span>
#include <string>

#include "agent/core/node_classes.h"
#include "agent/verify/kernel.h"

namespace cvagent::verify {

/// A fact of the tree in question.
struct Fact {
    std::string name;        ///< of the node: the interface, the device; "" where it has none
    std::string shown;       ///< the value as text; "" for one that the node has not
    unsigned int index = 0;  ///< of the node among those of its class, from 1
};

using Text = std::optional<std::string>;
/// What the kernel or a file of the host says of a fact: the text that is shown when it agrees. Nothing where
/// neither knows.
using Says = Text (*)(const Kernel& kernel, const Fact& fact);

struct Check {
    NodeType type;
    unsigned int id;
    unsigned int nameProperty;  ///< of the node; 0 where none is looked up
    Says says;
    const char* why = nullptr;  ///< where the plug-in has it from, when that is no question to the kernel
    bool isOptional = false;    ///< a node without it says that there is none
};

std::span<const Check> linkChecks();
std::span<const Check> addressChecks();
std::span<const Check> hostChecks();

/// What is shown for a link that the kernel does not have.
constexpr const char* kNoLink = "there is no such link";
/// For a value that is shown and that nobody knows.
constexpr const char* kNone = "(none)";

inline std::string yesOrNo(bool yes) {
    return yes ? "true" : "false";
}

/// The name of a link, in each of the properties that have it.
Text linkName(const Kernel& kernel, const Fact& fact);

}  // namespace cvagent::verify
