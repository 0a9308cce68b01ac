#include "tests/hardware/recorded_host.h"

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <regex>
#include <sstream>
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
    static const std::regex range(R"(\{(\d+)-(\d+)\})");
    std::smatch found;
    if (!std::regex_search(entry.path, found, range)) {
        make(host, entry);
        return;
    }
    for (int number = std::stoi(found[1]); number <= std::stoi(found[2]); ++number) {
        const std::string path = found.prefix().str() + std::to_string(number) + found.suffix().str();
        makeAll(host, {withNumber(path, number), entry.sign, withNumber(entry.text, number)});
    }
}

}  // namespace

RecordedHost::RecordedHost() {
    const bool memory = fs::is_directory("/dev/shm");  // many small files, made and removed
    root_ = (memory ? fs::path("/dev/shm") : fs::temp_directory_path()) / "hardware-host-XXXXXX";
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
    static const std::regex line(R"((/\S*)(:| ->| =)(?: (.*))?)");
    std::ifstream in(list);
    std::optional<Entry> entry;
    for (std::string text; std::getline(in, text);) {
        std::smatch parts;
        if (text.starts_with('|') && entry) {
            entry->text += (entry->text.empty() ? "" : "\n") + text.substr(1);
        } else if (std::regex_match(text, parts, line)) {
            if (entry) {
                makeAll(*this, *entry);
            }
            const std::string sign = parts[2];
            entry = {parts[1], sign == ":" ? sign : sign.substr(1), parts[3]};
        } else if (!text.empty() && !text.starts_with('#')) {
            throw std::runtime_error(list + ": not understood: " + text);
        }
    }
    if (entry) {
        makeAll(*this, *entry);
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
        if (row.type == type && row.name == property && fact != found.facts.all().end()) {
            return golden::text(fact->second);
        }
    }
    return "";
}
