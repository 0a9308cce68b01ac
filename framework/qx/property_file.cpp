#include "framework/qx/property_file.h"

#include <algorithm>
#include <string_view>
#include <system_error>

#include "framework/qx/property_line.h"
#include "framework/qx/strings.h"
#include "framework/qx/whole_file.h"

namespace QX {
namespace {

std::map<std::wstring, std::wstring> parse(std::string_view content) {
    std::map<std::wstring, std::wstring> values;
    while (!content.empty()) {
        const std::string_view line = content.substr(0, content.find('\n'));
        content.remove_prefix(std::min(line.size() + 1, content.size()));
        if (const auto entry = parsePropertyLine(line)) {
            values[make_wstring(entry->first)] = make_wstring(entry->second);
        }
    }
    return values;
}

std::string format(const std::map<std::wstring, std::wstring>& values) {
    std::string content;
    for (const auto& [key, value] : values) {
        content += formatPropertyLine(make_string(key), make_string(value)) + '\n';
    }
    return content;
}

}  // namespace

PropertyFileError::~PropertyFileError() = default;

PropertyFile::PropertyFile(const File::Path& path) : path_(path.str()) {}
PropertyFile::~PropertyFile() = default;

void PropertyFile::open(unsigned long mode) {
    if (mode != forReading && mode != forWriting) {
        throw PropertyFileError(path_ + ": no such mode: " + std::to_string(mode));
    }
    try {
        const auto content = readWholeFile(path_);
        if (!content && mode == forReading) {
            throw PropertyFileError(path_ + ": no such file");
        }
        values_ = parse(content.value_or(""));
        changed_ = !content;
        mode_ = mode;
    } catch (const std::system_error& error) {
        throw PropertyFileError(error.what());
    }
}

void PropertyFile::close() {
    if (mode_ == forWriting && changed_) {
        try {
            replaceWholeFile(path_, format(values_));
        } catch (const std::system_error& error) {
            throw PropertyFileError(error.what());
        }
    }
    mode_ = 0;
    changed_ = false;
    values_.clear();
}

std::wstring PropertyFile::getValue(const std::wstring& key) const {
    const auto found = values_.find(key);
    return found == values_.end() ? std::wstring() : found->second;
}

void PropertyFile::setValue(const std::wstring& key, const std::wstring& value) {
    requireWritable();
    const auto [entry, added] = values_.try_emplace(key, value);
    if (added || entry->second != value) {
        entry->second = value;
        changed_ = true;
    }
}

void PropertyFile::createKey(const std::wstring& key) {
    requireWritable();
    if (values_.try_emplace(key).second) {
        changed_ = true;
    }
}

std::vector<std::wstring> PropertyFile::enumerateKeys() const {
    std::vector<std::wstring> keys;
    keys.reserve(values_.size());
    for (const auto& entry : values_) {
        keys.push_back(entry.first);
    }
    return keys;
}

void PropertyFile::requireWritable() const {
    if (mode_ != forWriting) {
        throw PropertyFileError(path_ + ": not open for writing");
    }
}

}  // namespace QX
