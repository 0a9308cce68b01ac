#pragma once

#include <map>
#include <string>
#include <vector>

#include "agent/change/interface_settings.h"
#include "agent/change/kernel_network.h"

namespace cvagent::change {

/// A value that is to be set, of a property of the first plug-in's catalogue; it has been accepted for that.
struct Wanted {
    unsigned int property = 0;
    std::vector<std::string> words;
    std::string interface;  ///< see interfaceNameOf; "" for nodes that are about none
    bool isComputer = false;
};

/// What the checks know of the host.
struct HostFacts {
    KernelNetwork network;
    std::map<std::string, InterfaceSettings> files;  ///< of the interfaces that are changed
    std::string clockSteeredBy;                      ///< see clock_source.h

    /// Asks for no more than these changes need.
    static HostFacts of(const std::vector<Wanted>& changes);
};

struct Objection {
    std::size_t change = 0;  ///< index
    std::string reason;
};

/// What speaks against several changes made as one. Of an interface that the kernel does not have nothing is
/// known, and nothing said.
std::vector<Objection> objectionsTo(const std::vector<Wanted>& changes, const HostFacts& host);

}  // namespace cvagent::change
