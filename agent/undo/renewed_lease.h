#pragma once

#include <cstdint>
#include <optional>
#include <string>

namespace cvagent::undo {

/// Makes NetworkManager bring the settings of a link into force; the link's name follows.
inline constexpr const char* kReapply = "nmcli device reapply";

/// The lease of a link on the way through that. NetworkManager asks for it anew, and takes one that is the
/// same to the second for no news: it has none of its name servers then, and may lose its address.
class RenewedLease {
public:
    /// Before: waits until the lease that is there is more than a second old.
    explicit RenewedLease(const std::string& link);
    /// Behind: until it is another one, or none; three seconds at most.
    void wait() const;

private:
    std::optional<std::uint32_t> stamp() const;

    unsigned link_;
    std::optional<std::uint32_t> old_;
};

}  // namespace cvagent::undo
