#include "tests/hardware/golden.h"

#include <map>
#include <sstream>

#include "plugins/hardware/hardware_node.h"
#include "plugins/hardware/sources.h"

namespace hardware_test {

namespace {

std::string label(hardware::Class type, const std::string& name) {
    return hardware::classRow(type).name + (name.empty() ? "" : ":" + name);
}

std::string text(const IC::PropertyValue& value) {
    std::ostringstream out;
    const std::vector<std::string>* const texts = value.asTexts();
    if (texts == nullptr) {
        out << value;
    }
    for (std::size_t at = 0; texts != nullptr && at < texts->size(); ++at) {
        out << (at == 0 ? "" : " | ") << (*texts)[at];
    }
    return out.str();
}

void tell(const hardware::Found& found, std::ostream& out) {
    out << label(found.type, found.name);
    if (found.parent) {
        out << " under " << label(found.parent->first, found.parent->second);
    }
    out << '\n';
    for (const hardware::Row& row : hardware::allRows()) {
        const auto fact = found.facts.all().find(row.id);
        if (row.type != found.type || fact == found.facts.all().end()) {
            continue;
        }
        out << "  " << row.name << (row.audience == hardware::Audience::trusted ? " (trusted)" : "") << ": ";
        out << text(fact->second);
        out << (*row.unit == '\0' ? "" : " ") << row.unit << '\n';
    }
}

}  // namespace

std::string told(const hardware::Host& host) {
    std::ostringstream out;
    for (const hardware::Source& source : hardware::sources()) {
        for (const std::string& name : source.list(host)) {
            hardware::Found found = hardware::nameOnly(source.type, name);
            source.describe(host, found);
            tell(found, out);
        }
    }
    return out.str();
}

std::map<std::string, std::string> factsOf(const hardware::Host& host, hardware::Class type,
                                           const std::string& name) {
    std::map<std::string, std::string> facts;
    hardware::Found found{type, name};
    for (const hardware::Source& source : hardware::sources()) {
        if (source.type == type) {
            source.describe(host, found);
        }
    }
    for (const hardware::Row& row : hardware::allRows()) {
        const auto fact = found.facts.all().find(row.id);
        if (row.type == type && fact != found.facts.all().end()) {
            facts[row.name] = text(fact->second);
        }
    }
    return facts;
}

std::filesystem::path recordedHosts() {
    return std::filesystem::path(CORVISTA_TESTS_DIR) / "hardware/hosts";
}

}  // namespace hardware_test
