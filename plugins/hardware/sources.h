#pragma once

#include <span>
#include <string>
#include <vector>

#include "plugins/hardware/found.h"
#include "plugins/hardware/host.h"

namespace hardware {

/// One kind of thing that can be found on a host.
struct Source {
    Class type;
    Rows rows;
    /// The names of what there is. Reads directories only and never waits for a device.
    std::vector<std::string> (*list)(const Host& host);
    /// Adds all that is known of one of them; may wait for the device, so it runs under a deadline. What has
    /// gone meanwhile gets no facts. Type, name and the fact that holds the name are there already.
    void (*describe)(const Host& host, Found& found);
    /// Kernel news that concern it: a subsystem of uevents, "" for none.
    const char* subsystem;
    /// What is asked for the thing of that name, where several share it; itself without one.
    std::string (*device)(const std::string& name) = nullptr;
};

/// All sources, parents before what hangs under them.
std::span<const Source> sources();

}  // namespace hardware
