#pragma once

#include <functional>
#include <map>
#include <optional>
#include <string>

#include "agent/keep/daemons.h"
#include "agent/keep/manager.h"

namespace cvagent::keep {

/// What NetworkManager told as long as it could be asked.
class LostManager {
public:
    /// Asks it of all links.
    explicit LostManager(std::function<void(const std::string&)> tell);

    // As who asks it would hear.
    std::optional<ManagedLink> on(const std::string& link) const;
    ManagerProfile profileOn(const std::string& link) const;
    const std::function<void(const std::string&)>& tell() const { return tell_; }

private:
    struct Told {
        ManagedLink link;
        std::string silence;  ///< why it is not known, or ""
        std::optional<ManagerProfile> profile;
        std::string refusal;
    };
    static std::optional<Told> ask(const std::string& link, Daemons& daemons);

    std::function<void(const std::string&)> tell_;
    std::map<std::string, Told> links_;
};

/// Null where it can be asked.
const LostManager* lostManager();

}  // namespace cvagent::keep
