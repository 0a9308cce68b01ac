#pragma once

#include <string>
#include <vector>

#include "hosttools/descriptor.h"

namespace cvagent::change {

/// A network that is as that of the calling process, as far as a network without hardware can be: links with
/// the same names, indices, hardware addresses, sizes and states, addresses, routes, rules.
struct NetworkCopy {
    hosttools::Descriptor handle;      ///< for setns
    hosttools::Descriptor peers;       ///< the network of the cables' other ends; with it they go
    std::vector<std::string> missing;  ///< lines of the kernel's state that the copy has not
    std::vector<std::string> added;    ///< and those that only it has
};

/// Makes one, which belongs to the user namespace of the calling process. Single-threaded. Throws Cannot.
NetworkCopy copyNetwork();

/// The calling thread, and those that it starts later, are in it from here on. Throws Cannot.
void enterNetwork(const NetworkCopy& copy);

}  // namespace cvagent::change
