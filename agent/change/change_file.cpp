#include "agent/change/change_file.h"

#include <nlohmann/json.hpp>
#include <set>

#include "agent/core/text.h"

namespace cvagent::change {

namespace {

using Json = nlohmann::ordered_json;

constexpr int kDeepest = 4;  // the document, the list, a change, a list of words
constexpr std::size_t kLongestMessage = 300;

/// Says where a document is no JSON, without the library's prefix.
std::string plainMessage(const std::string& message) {
    const std::size_t end = message.find("] ");
    const std::string text = printable(end == std::string::npos ? message : message.substr(end + 2));
    return text.size() <= kLongestMessage ? text : text.substr(0, kLongestMessage) + "...";
}

/// Looks at a document while it is read, before anything of it is kept.
class Guard {
public:
    bool operator()(int depth, Json::parse_event_t event, const Json& parsed) {
        if (depth > kDeepest) {
            throw BadChangeFile("it has more levels than a file of changes has");
        }
        if (event == Json::parse_event_t::object_start) {
            keys_.emplace_back();
        } else if (event == Json::parse_event_t::object_end) {
            keys_.pop_back();
        } else if (event == Json::parse_event_t::key && !keys_.back().insert(parsed).second) {
            throw BadChangeFile("the key " + inQuotes(parsed) + " stands twice in one object");
        }
        return true;
    }

private:
    std::vector<std::set<std::string>> keys_;
};

Json parsed(std::string_view text) {
    if (text.size() > kLongestChangeFile) {
        throw BadChangeFile("it is longer than " + std::to_string(kLongestChangeFile) + " bytes");
    }
    try {
        return Json::parse(text.begin(), text.end(),
                           [guard = Guard()](int depth, auto event, auto& json) mutable {
                               return guard(depth, event, json);
                           });
    } catch (const Json::exception& error) {
        throw BadChangeFile(plainMessage(error.what()));
    }
}

std::string wordOf(const Json& value, const std::string& place) {
    if (value.is_string()) {
        return value;
    }
    if (value.is_number_integer()) {
        return value.dump();
    }
    throw BadChangeFile(place + " is neither a text nor a whole number");
}

std::vector<std::string> wordsOf(const Json& value, const std::string& place) {
    if (!value.is_array()) {
        return {wordOf(value, place)};
    }
    if (value.size() > kMostWords) {
        throw BadChangeFile(place + " has more than " + std::to_string(kMostWords) + " words");
    }
    std::vector<std::string> words;
    for (std::size_t i = 0; i < value.size(); ++i) {
        words.push_back(wordOf(value[i], place + "[" + std::to_string(i) + "]"));
    }
    return words.empty() ? std::vector<std::string>(1) : words;
}

void refuseOtherKeys(const Json& object, const std::set<std::string>& known, const std::string& place) {
    for (const auto& [key, value] : object.items()) {
        if (!known.contains(key)) {
            throw BadChangeFile(place + " has a key " + inQuotes(key) + " that means nothing here");
        }
    }
}

const Json& member(const Json& object, const char* key, const std::string& place) {
    const auto found = object.find(key);
    if (found == object.end()) {
        throw BadChangeFile(place + " has no " + inQuotes(key));
    }
    return *found;
}

NamedChange changeOf(const Json& object, const std::string& place) {
    if (!object.is_object()) {
        throw BadChangeFile(place + " is no object");
    }
    refuseOtherKeys(object, {"node", "property", "value"}, place);
    NamedChange change;
    change.place = place;
    const Json& node = member(object, "node", place);
    if (!node.is_string()) {
        throw BadChangeFile(place + ".node is no text");
    }
    change.node = node;
    change.property = wordOf(member(object, "property", place), place + ".property");
    change.words = wordsOf(member(object, "value", place), place + ".value");
    return change;
}

}  // namespace

std::vector<NamedChange> parseChanges(std::string_view text) {
    const Json document = parsed(text);
    if (document.is_object()) {
        refuseOtherKeys(document, {"changes"}, "the document");
    }
    const Json& list = document.is_object() ? member(document, "changes", "the document") : document;
    if (!list.is_array()) {
        throw BadChangeFile("there is no list of changes");
    }
    if (list.size() > kMostChanges) {
        throw BadChangeFile("it has more than " + std::to_string(kMostChanges) + " changes");
    }
    std::vector<NamedChange> changes;
    for (std::size_t i = 0; i < list.size(); ++i) {
        changes.push_back(changeOf(list[i], "changes[" + std::to_string(i) + "]"));
    }
    return changes;
}

std::string changeFileText(const std::vector<NamedChange>& changes) {
    Json list = Json::array();
    for (const NamedChange& change : changes) {
        Json value = change.words;
        if (change.words.size() == 1) {
            value = change.words.front();
        }
        list.push_back({{"node", change.node}, {"property", change.property}, {"value", std::move(value)}});
    }
    return Json{{"changes", std::move(list)}}.dump(2, ' ', false, Json::error_handler_t::replace) + "\n";
}

}  // namespace cvagent::change
