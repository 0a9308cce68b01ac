#include "agent/core/property_words.h"

#include <set>

#include "agent/core/problem.h"
#include "agent/core/text.h"
#include "framework/qx/whole_number.h"

namespace cvagent {

namespace {

/// "a team", "an ip-config"
std::string withArticle(const std::string& nodeClass) {
    return (nodeClass.find_first_of("aeio") == 0 ? "an " : "a ") + nodeClass;
}

[[noreturn]] void failWithout(const std::string& nodeClass, const std::string& word) {
    throw Problem(Problem::notFound, withArticle(nodeClass) + " has no property " + inQuotes(word),
                  Problem::property, nodeClass);
}

unsigned int readableId(const IC::MutableNode& node, const std::string& word) {
    if (const Property* row = findProperty(node.nodeType(), word)) {
        if (!row->readable) {
            throw Problem(Problem::notFound, std::string(row->name) + " can be written but not read");
        }
        return row->id;
    }
    if (const auto id = QX::wholeNumber<unsigned int>(word)) {
        return *id;
    }
    failWithout(className(node.nodeType()), word);
}

/// What the catalogue knows of the class and whatever else the node has stored.
std::vector<unsigned int> allIds(const IC::MutableNode& node) {
    std::set<unsigned int> ids;
    for (const Property* row : propertiesOf(node.nodeType())) {
        if (row->readable) {
            ids.insert(row->id);
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

const Property& writableRow(const IC::MutableNode& node, const std::string& word) {
    const std::string nodeClass = className(node.nodeType());
    const Property* row = findProperty(node.nodeType(), word);
    if (row == nullptr) {
        failWithout(nodeClass, word);
    }
    if (!row->writable()) {
        throw Problem(Problem::refused,
                      std::string(row->name) + " of " + withArticle(nodeClass) + " cannot be written",
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

const Label* drasticLabel(const Property& row, const IC::PropertyValue& value) {
    const bool isCode = !row.labels.empty() && (value.asEnum() != nullptr || value.asNumber() != nullptr);
    const Label* label = isCode ? findLabel(row, static_cast<unsigned int>(value)) : nullptr;
    return label != nullptr && label->drastic ? label : nullptr;
}

}  // namespace cvagent
