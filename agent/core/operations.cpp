#include "agent/core/operations.h"

#include <set>

#include "agent/core/problem.h"
#include "agent/core/text.h"

namespace cvagent {

namespace {

constexpr unsigned int kPowerAction = 123;  // of the computer
constexpr unsigned int kRestart = 9;
constexpr unsigned int kHalt = 12;

[[noreturn]] void failWithout(const std::string& nodeClass, const std::string& word) {
    throw Problem(Problem::notFound, "a " + nodeClass + " has no property " + inQuotes(word),
                  Problem::property, nodeClass);
}

unsigned int readableId(const IC::MutableNode& node, const std::string& word) {
    if (const auto row = findProperty(node.nodeType(), word)) {
        if (!row->readable()) {
            throw Problem(Problem::notFound, std::string(row->name) + " can be written but not read");
        }
        return row->id;
    }
    const std::string digits = "0123456789";
    if (!word.empty() && word.size() < 10 && word.find_first_not_of(digits) == std::string::npos) {
        return static_cast<unsigned int>(std::stoul(word));
    }
    failWithout(className(node.nodeType()), word);
}

/// What the catalogue knows of the class and whatever else the node has stored.
std::vector<unsigned int> allIds(const IC::MutableNode& node) {
    std::set<unsigned int> ids;
    for (const Property& row : propertiesOf(node.nodeType())) {
        if (row.readable()) {
            ids.insert(row.id);
        }
    }
    for (const auto& [id, value] : storedProperties(node)) {
        ids.insert(id);
    }
    return {ids.begin(), ids.end()};
}

std::string allQuoted(const std::vector<std::string>& words) {
    std::string text;
    for (const std::string& word : words) {
        if (text.size() > 200) {
            return text + " and more";
        }
        text += (text.empty() ? "" : " ") + inQuotes(word);
    }
    return text;
}

}  // namespace

std::vector<unsigned int> readableIds(const IC::MutableNode& node, const std::vector<std::string>& words) {
    std::vector<unsigned int> ids;
    ids.reserve(words.size());
    for (const std::string& word : words) {
        ids.push_back(readableId(node, word));
    }
    return words.empty() ? allIds(node) : ids;
}

Property writableRow(const IC::MutableNode& node, const std::string& word) {
    const std::string nodeClass = className(node.nodeType());
    const auto row = findProperty(node.nodeType(), word);
    if (!row) {
        failWithout(nodeClass, word);
    }
    if (!row->writable()) {
        throw Problem(Problem::refused, std::string(row->name) + " of a " + nodeClass + " cannot be written",
                      Problem::property, nodeClass);
    }
    return *row;
}

IC::PropertyValue acceptedValue(const Property& row, const std::vector<std::string>& words) {
    const auto value = row.check(row, words);
    if (!value) {
        throw Problem(Problem::refused, allQuoted(words) + " is not accepted for " + row.name +
                                            "; accepted: " + acceptedText(row));
    }
    return *value;
}

PowerAction powerAction(const Property& row, const IC::PropertyValue& value) {
    if (row.type != NodeType::computer || row.id != kPowerAction) {
        return PowerAction::none;
    }
    const auto action = static_cast<unsigned int>(value);
    return action == kRestart ? PowerAction::restart
           : action == kHalt  ? PowerAction::halt
                              : PowerAction::none;
}

}  // namespace cvagent
