#pragma once

#include <chrono>
#include <functional>
#include <map>
#include <optional>
#include <string>

#include "agent/service/callers.h"

namespace cvagent::service {

/// Who may do something.
enum class Audience {
    everybody,  ///< it is to be seen on the host anyway
    trusted,    ///< root and the trusted group
    writers,    ///< whom polkit lets change the host; without polkit root and the trusted group
    stoppers,   ///< the same for what stops the host
    planners,   ///< the same for who lets the host try a change out
    keepers,    ///< the same for who keeps changes that were made, or takes them back
};

/// The one place where is judged who may. Root may everything, and so may the user the service runs as. The
/// loop's thread.
class Consent {
public:
    /// What a decision is about, for polkit's question and for the log.
    struct Question {
        Audience audience = Audience::everybody;
        std::string deed;  ///< "write network-port:eth0 LinkState"
        bool mayAskUser = false;
    };
    /// @param reason why not, for people
    using Decided = std::function<void(bool allowed, const std::string& reason)>;

    /// @param connection outlives it
    explicit Consent(bus::Connection& connection) : connection_(connection) {}

    /// @param group by its name; there need be none
    void setTrustedGroup(const std::string& group);
    bool isTrusted(const Caller& caller) const;
    /// Root, or the user that the service runs as.
    static bool isOwn(const Caller& caller);
    /// Decides at once, or when polkit has; polkit may ask the user first, who can take his time.
    void ask(const Caller& caller, const Question& question, Decided decided);
    /// "polkit", or "group" where it was not there when somebody last looked.
    const char* source() const { return polkitFound_ ? "polkit" : "group"; }
    /// Looks whether there is polkit.
    void lookForPolkit();

private:
    void askPolkit(const Caller& caller, const Question& question, Decided decided);
    void polkitAnswered(const Caller& caller, const bus::Message& answer, const Decided& decided);

    bus::Connection& connection_;
    std::string groupName_;
    std::optional<std::uint32_t> group_;
    bool polkitFound_ = false;
    std::uint64_t asked_ = 0;
    std::map<std::uint64_t, bus::Slot> pending_;
    std::map<std::uint32_t, std::size_t> pendingOf_;  // by user
    bus::Slot look_;
};

}  // namespace cvagent::service
