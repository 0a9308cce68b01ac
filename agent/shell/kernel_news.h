#pragma once

#include <sys/types.h>

#include "hosttools/descriptor.h"

namespace cvagent::shell {

/// Tells whether the kernel has announced a change of links, addresses or routes. Not for several threads at
/// a time.
class KernelNews {
public:
    /// @return whether nothing was announced since the last call. In doubt, as after news that were lost, it
    /// is no. What is read after a "no" is what the kernel has from then on.
    bool isQuiet();

private:
    bool subscribe();
    bool drain() const;

    hosttools::Descriptor socket_;
    pid_t owner_ = 0;
    ino_t network_ = 0;
};

}  // namespace cvagent::shell
