#pragma once

#include <string>

namespace cvagent::service {

/// Notices that the host may be called otherwise, or have other name servers, leases or another time zone, of
/// which the kernel announces nothing: by its name and by the dates of the files that the rest is in. It
/// opens none of them. One thread.
class HostFiles {
public:
    /// Whether something may be different since the last call; not at the first.
    bool haveChanged();

private:
    std::string last_;
};

}  // namespace cvagent::service
