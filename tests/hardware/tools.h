#pragma once

#include <algorithm>
#include <array>
#include <cctype>
#include <cmath>
#include <cstdio>
#include <map>
#include <memory>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "tests/hardware/recorded_host.h"

/// The host's own tools, whose answers are compared with the plug-in's.
namespace hardware_test {

/// What a command prints; "" when there is no such tool.
inline std::string printed(const std::string& command) {
    std::string text;
    const std::unique_ptr<FILE, int (*)(FILE*)> pipe(popen((command + " 2>/dev/null").c_str(), "r"), pclose);
    std::array<char, 4096> piece{};
    for (std::size_t count = 0; (count = fread(piece.data(), 1, piece.size(), pipe.get())) > 0;) {
        text.append(piece.data(), count);
    }
    return text;
}

/// Its first line; "" when it prints none.
inline std::string firstLine(const std::string& command) {
    const std::string text = printed(command);
    return text.substr(0, text.find('\n'));
}

/// What it prints as JSON; null when that is none.
inline nlohmann::json printedJson(const std::string& command) {
    const nlohmann::json all = nlohmann::json::parse(printed(command), nullptr, false);
    return all.is_discarded() ? nlohmann::json() : all;
}

/// The fields of lscpu -J by their names; those of groups among them.
inline void addFields(const nlohmann::json& rows, std::map<std::string, std::string>& fields) {
    for (const nlohmann::json& row : rows) {
        if (row.contains("data") && row["data"].is_string()) {
            fields[row.value("field", "")] = row["data"];
        }
        if (row.contains("children")) {
            addFields(row["children"], fields);
        }
    }
}

/// What lscpu tells; nothing where it is not installed.
inline std::map<std::string, std::string> lscpu(const std::string& options) {
    std::map<std::string, std::string> fields;
    const nlohmann::json all = printedJson("LC_ALL=C lscpu -J -B " + options);
    if (all.is_object() && all.contains("lscpu")) {
        addFields(all["lscpu"], fields);
    }
    return fields;
}

/// The text without colons and semicolons: lscpu writes the one for the other, or none.
inline std::string withoutColons(std::string text) {
    std::erase_if(text, [](char letter) { return letter == ':' || letter == ';'; });
    return text;
}

/// lscpu's "Vulnerability Spectre v2:" with "Mitigation; x" as "spectre_v2 Mitigation x"; those that the
/// processor has.
inline std::vector<std::string> weaknesses(const std::map<std::string, std::string>& fields) {
    static const std::string prefix = "Vulnerability ";
    std::vector<std::string> all;
    for (const auto& [field, text] : fields) {
        if (field.starts_with(prefix) && text != "Not affected") {
            std::string name = field.substr(prefix.size());
            std::replace(name.begin(), name.end(), ' ', '_');
            name.front() = static_cast<char>(std::tolower(static_cast<unsigned char>(name.front())));
            all.push_back(withoutColons(name + " " + text));
        }
    }
    return all;
}

/// The known weaknesses of the first processor, to be compared with these.
inline std::vector<std::string> ownWeaknesses(const hardware::Host& host) {
    hardware::Found found{hardware::Class::processor, listed(host, hardware::Class::processor).front()};
    sourceOf(found.type).describe(host, found);
    std::vector<std::string> all;
    for (const auto& row : sourceOf(found.type).rows) {
        const auto fact = found.facts.all().find(row.id);
        if (std::string(row.name) == "Weaknesses" && fact != found.facts.all().end()) {
            std::ranges::transform(*fact->second.asTexts(), std::back_inserter(all), withoutColons);
        }
    }
    return all;
}

/// "2100.0000" megahertz, in kilohertz.
inline std::string kilohertz(const std::string& megahertz) {
    return megahertz.empty() ? "" : std::to_string(std::llround(std::stod(megahertz) * 1000));
}

}  // namespace hardware_test
