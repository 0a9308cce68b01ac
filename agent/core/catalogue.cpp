#include "agent/core/catalogue.h"

#include <strings.h>
#include <algorithm>
#include <charconv>

#include "agent/core/value_check.h"

namespace cvagent {

std::vector<Property> propertiesOf(unsigned int nodeType) {
    std::vector<Property> rows;
    for (const auto part :
         {hostProperties(), storageProperties(), networkPortProperties(), ipConfigProperties()}) {
        std::copy_if(part.begin(), part.end(), std::back_inserter(rows), [nodeType](const Property& row) {
            return static_cast<unsigned int>(row.type) == nodeType;
        });
    }
    return rows;
}

std::optional<Property> findProperty(unsigned int nodeType, unsigned int id) {
    for (const Property& row : propertiesOf(nodeType)) {
        if (row.id == id) {
            return row;
        }
    }
    return std::nullopt;
}

std::optional<Property> findProperty(unsigned int nodeType, const std::string& text) {
    unsigned int id = 0;
    const char* end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, id);
    if (error == std::errc() && stop == end) {
        return findProperty(nodeType, id);
    }
    for (const Property& row : propertiesOf(nodeType)) {
        if (strcasecmp(row.name, text.c_str()) == 0) {
            return row;
        }
    }
    return std::nullopt;
}

const char* kindName(Kind kind) {
    switch (kind) {
        case Kind::number:
            return "number";
        case Kind::enumeration:
            return "enum";
        case Kind::text:
            return "text";
        case Kind::texts:
            return "texts";
        case Kind::numbers:
            return "numbers";
    }
    return "none";
}

const char* unitName(Unit unit) {
    switch (unit) {
        case Unit::none:
            return "";
        case Unit::thousandBytes:
            return "kB";
        case Unit::kibibytes:
            return "KiB";
        case Unit::kilobitsPerSecond:
            return "kbit/s";
        case Unit::megabitsPerSecond:
            return "Mbit/s";
        case Unit::megahertz:
            return "MHz";
        case Unit::secondsSinceEpoch:
            return "s since 1970";
        case Unit::minutes:
            return "min";
        case Unit::bits:
            return "bits";
    }
    return "";
}

const char* labelOf(const Property& property, unsigned int code) {
    const auto found = std::find_if(property.labels.begin(), property.labels.end(),
                                    [code](const Label& label) { return label.code == code; });
    return found == property.labels.end() ? nullptr : found->text;
}

std::string acceptedText(const Property& property) {
    std::string text = property.accepts != nullptr ? property.accepts : "";
    const auto add = [&text](const std::string& item) {
        text += (text.empty() || text.ends_with(' ') ? "" : ", ") + item;
    };
    if (property.check == check::timeZoneOffset) {
        for (const int offset : check::zoneOffsets()) {
            add(std::to_string(offset));
        }
    }
    for (const Label& label : property.labels) {
        if (label.writable && property.accepts == nullptr) {
            add(std::to_string(label.code) + " (" + label.text + ")");
        }
    }
    return text;
}

}  // namespace cvagent
