#include "plugins/hardware/found.h"

#include <algorithm>
#include <iterator>

#include "plugins/hardware/host.h"

namespace hardware {

void Facts::put(Id id, IC::PropertyValue value) {
    facts_[id] = std::move(value);
}

void Facts::text(Id id, const std::optional<std::string>& value) {
    if (value && !value->empty()) {
        put(id, IC::PropertyValue(printable(*value), true));
    }
}

void Facts::texts(Id id, const std::vector<std::string>& values) {
    if (!values.empty()) {
        std::vector<std::string> shown;
        std::transform(values.begin(), values.end(), std::back_inserter(shown), printable);
        put(id, IC::PropertyValue(shown, true));
    }
}

void Facts::number(Id id, std::optional<unsigned long long> value) {
    if (value) {
        put(id, IC::PropertyValue(IC::Number(*value), true));
    }
}

void Facts::real(Id id, std::optional<double> value) {
    if (value) {
        put(id, IC::PropertyValue(IC::Number(*value), true));
    }
}

void Facts::flag(Id id, std::optional<bool> value) {
    if (value) {
        put(id, IC::PropertyValue(IC::Number(*value), true));
    }
}

void Facts::keepOld(const Facts& before) {
    for (const Id id : unanswered_) {
        if (const auto old = before.facts_.find(id); old != before.facts_.end()) {
            facts_.insert(*old);
        }
    }
}

}  // namespace hardware
