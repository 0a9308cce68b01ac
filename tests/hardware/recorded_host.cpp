#include "tests/hardware/recorded_host.h"

#include <unistd.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <stdexcept>

#include "tests/hardware/golden.h"

namespace fs = std::filesystem;
using hardware::Class;

namespace {

std::string withNumber(std::string text, int number) {
    for (std::size_t at = 0; (at = text.find("{}", at)) != std::string::npos;) {
        text.replace(at, 2, std::to_string(number));
    }
    return text;
}

std::string fromHexadecimal(const std::string& digits) {
    std::string bytes;
    for (std::size_t at = 0; at + 1 < digits.size(); at += 2) {
        bytes += static_cast<char>(std::stoi(digits.substr(at, 2), nullptr, 16));
    }
    return bytes;
}

struct Entry {
    std::string path;
    std::string sign;  ///< ":", "->" or "="
    std::string text;
};

void make(const RecordedHost& host, const Entry& entry) {
    if (entry.sign == "->") {
        host.link(entry.path, entry.text);
    } else if (entry.sign == "=") {
        host.file(entry.path, "");
        std::ofstream(host.root() + entry.path) << fromHexadecimal(entry.text);
    } else {
        host.file(entry.path, entry.text);
    }
}

/// A range of numbers in the path stands for as many entries.
void makeAll(const RecordedHost& host, const Entry& entry) {
    const std::size_t start = entry.path.find('{');
    const std::size_t end = entry.path.find('}', std::min(start, entry.path.size()));
    const std::size_t dash = entry.path.find('-', std::min(start, entry.path.size()));
    if (end == std::string::npos || dash > end) {
        make(host, entry);
        return;
    }
    const int last = std::stoi(entry.path.substr(dash + 1));
    for (int number = std::stoi(entry.path.substr(start + 1)); number <= last; ++number) {
        const std::string path =
            entry.path.substr(0, start) + std::to_string(number) + entry.path.substr(end + 1);
        makeAll(host, {withNumber(path, number), entry.sign, withNumber(entry.text, number)});
    }
}

/// "/path: text", "/path -> target", "/path = bytes"; nothing for other lines.
std::optional<Entry> entryOf(const std::string& line) {
    const std::size_t blank = std::min(line.find(' '), line.size());
    const std::string path = line.substr(0, blank);
    if (path.starts_with('/') && path.ends_with(':')) {
        return Entry{path.substr(0, path.size() - 1), ":", line.substr(std::min(blank + 1, line.size()))};
    }
    const std::size_t next = std::min(line.find(' ', blank + 1), line.size() - 1);
    const std::string sign = blank < line.size() ? line.substr(blank + 1, next - blank - 1) : "";
    const bool known = path.starts_with('/') && (sign == "->" || sign == "=");
    return known ? std::optional(Entry{path, sign, line.substr(next + 1)}) : std::nullopt;
}

/// Thousands of small files are made: in memory, where there is room for them.
fs::path directory() {
    return access("/dev/shm", W_OK) == 0 ? "/dev/shm" : fs::temp_directory_path();
}

}  // namespace

RecordedHost::RecordedHost() : root_(directory() / "hardware-host-XXXXXX") {
    if (mkdtemp(root_.data()) == nullptr) {
        throw std::runtime_error("no directory for a recorded host");
    }
}

RecordedHost::~RecordedHost() {
    fs::remove_all(root_);
}

void RecordedHost::file(const std::string& path, const std::string& text) const {
    fs::create_directories(fs::path(root_ + path).parent_path());
    if (!path.ends_with('/')) {
        std::ofstream(root_ + path) << text << '\n';
    }
}

void RecordedHost::link(const std::string& path, const std::string& target) const {
    fs::create_directories(fs::path(root_ + path).parent_path());
    fs::create_symlink(target, root_ + path);
}

void RecordedHost::remove(const std::string& path) const {
    fs::remove_all(root_ + path);
}

void RecordedHost::unpack(const std::string& list) const {
    std::ifstream in(list);
    std::vector<Entry> all;
    for (std::string text; std::getline(in, text);) {
        if (text.starts_with('|') && !all.empty()) {
            all.back().text += (all.back().text.empty() ? "" : "\n") + text.substr(1);
        } else if (const auto entry = entryOf(text)) {
            all.push_back(*entry);
        } else if (!text.empty() && !text.starts_with('#')) {
            throw std::runtime_error(list + ": not understood: " + text);
        }
    }
    for (const Entry& entry : all) {
        makeAll(*this, entry);
    }
}

const hardware::Source& sourceOf(Class type) {
    const auto all = hardware::sources();
    return *std::find_if(all.begin(), all.end(), [type](const auto& source) { return source.type == type; });
}

std::vector<std::string> listed(const hardware::Host& host, Class type) {
    return sourceOf(type).list(host);
}

std::string told(const hardware::Host& host, Class type, const std::string& name) {
    hardware::Found found{type, name};
    sourceOf(type).describe(host, found);
    return golden::facts(found.facts.all(), "");
}

std::string told(const hardware::Host& host, Class type, const std::string& name,
                 const std::string& property) {
    hardware::Found found{type, name};
    sourceOf(type).describe(host, found);
    for (const hardware::Row& row : hardware::allRows()) {
        const auto fact = found.facts.all().find(row.id);
        if (hardware::classOfId(row.id) == type && row.name == property && fact != found.facts.all().end()) {
            return golden::text(fact->second);
        }
    }
    return "";
}
