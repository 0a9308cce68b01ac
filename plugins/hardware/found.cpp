#include "plugins/hardware/found.h"

namespace hardware {

void Facts::put(Id id, IC::PropertyValue value) {
    facts_[id] = std::move(value);
}

void Facts::text(Id id, const std::optional<std::string>& value) {
    if (value && !value->empty()) {
        put(id, IC::PropertyValue(*value, true));
    }
}

void Facts::texts(Id id, const std::vector<std::string>& values) {
    if (!values.empty()) {
        put(id, IC::PropertyValue(values, true));
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

}  // namespace hardware
