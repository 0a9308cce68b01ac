#pragma once

#include <map>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "framework/ic/property_value.h"
#include "plugins/hardware/catalogue.h"

namespace hardware {

/// The facts of one thing, by property id. What the host does not tell is left out, never made up.
class Facts {
public:
    using Map = std::map<unsigned int, IC::PropertyValue>;

    /// An empty text counts as not told; control characters are shown as '?'.
    void text(Id id, const std::optional<std::string>& value);
    void texts(Id id, const std::vector<std::string>& values);
    void number(Id id, std::optional<unsigned long long> value);
    void real(Id id, std::optional<double> value);
    void flag(Id id, std::optional<bool> value);

    /// Who knows it did not answer in time. What was known before stays, and is old.
    void unanswered(Id id) { unanswered_.insert(id); }
    bool isUnanswered(Id id) const { return unanswered_.contains(id); }
    /// Takes over what was known before of what is unanswered.
    void keepOld(const Facts& before);

    const Map& all() const { return facts_; }

private:
    void put(Id id, IC::PropertyValue value);

    Map facts_;
    std::set<Id> unanswered_;
};

/// One thing that was found: it becomes a node.
struct Found {
    Class type;
    std::string name;  ///< unique in its class; the last part of the node's path
    /// The node it hangs under; the plug-in's own node without one.
    std::optional<std::pair<Class, std::string>> parent{};
    std::string description{};
    Facts facts{};
};

}  // namespace hardware
