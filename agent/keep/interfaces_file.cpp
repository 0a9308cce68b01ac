#include "agent/keep/interfaces_file.h"

#include <glob.h>

#include <algorithm>
#include <array>
#include <cctype>
#include <sstream>

#include "agent/keep/host_files.h"

namespace cvagent::keep {

namespace {

constexpr const char* kMainFile = "/etc/network/interfaces";
/// More than any host has; a file may name itself.
constexpr std::size_t kMostFiles = 256;
constexpr std::array kKeywords = {"auto",       "iface",    "mapping",          "source", "no-auto-down",
                                  "no-scripts", "template", "source-directory", "rename"};

bool beginsSomething(const std::string& keyword) {
    return keyword.starts_with("allow-") || std::ranges::find(kKeywords, keyword) != kKeywords.end();
}

bool isContinued(const std::string& line) {
    return line.ends_with('\\');
}

Stanza headOf(const std::string& line, std::size_t number) {
    std::istringstream words(line);
    std::string word;
    Stanza stanza;
    words >> word >> stanza.name >> stanza.family >> stanza.method;
    while (words >> word) {
        stanza.inherits = stanza.inherits || word == "inherits";
    }
    // "iface eth0 inherits eth1" has no family of its own.
    stanza.inherits = stanza.inherits || stanza.family == "inherits" || isContinued(line);
    stanza.first = number;
    stanza.end = number + 1;
    return stanza;
}

/// As run-parts takes names, so that what a package manager has left behind is passed over.
bool isPlainName(const std::string& name) {
    return !name.empty() && std::ranges::all_of(name, [](unsigned char letter) {
        return std::isalnum(letter) != 0 || letter == '_' || letter == '-';
    });
}

std::vector<std::string> matching(const std::string& pattern) {
    glob_t found{};
    std::vector<std::string> paths;
    if (glob(pattern.c_str(), 0, nullptr, &found) == 0) {
        paths.assign(found.gl_pathv, found.gl_pathv + std::min<std::size_t>(found.gl_pathc, kMostFiles));
    }
    globfree(&found);
    return paths;
}

std::string seenFrom(const std::string& file, const std::string& path) {
    return path.starts_with('/') ? path : file.substr(0, file.rfind('/') + 1) + path;
}

std::vector<std::string> namedBy(const std::string& file, const std::string& line) {
    std::istringstream words(line);
    std::string keyword;
    std::vector<std::string> paths;
    words >> keyword;
    for (std::string pattern; words >> pattern;) {
        const bool isDirectory = keyword == "source-directory";
        for (std::string& path : matching(seenFrom(file, pattern) + (isDirectory ? "/*" : ""))) {
            if (!isDirectory || isPlainName(lastPart(path))) {
                paths.push_back(std::move(path));
            }
        }
    }
    return paths;
}

}  // namespace

std::string keywordOf(std::string_view line) {
    std::istringstream words{std::string(line)};
    std::string keyword;
    words >> keyword;
    return keyword.starts_with('#') ? "" : keyword;
}

std::vector<Stanza> stanzasIn(const std::vector<std::string>& lines) {
    std::vector<Stanza> found;
    bool isOpen = false;
    bool isRest = false;
    for (std::size_t number = 0; number < lines.size(); ++number) {
        const std::string keyword = isRest ? "" : keywordOf(lines[number]);
        if (beginsSomething(keyword)) {
            isOpen = keyword == "iface";
            if (isOpen) {
                found.push_back(headOf(lines[number], number));
            }
        } else if (isOpen && (isRest || !keyword.empty())) {
            found.back().end = number + 1;
        }
        isRest = isContinued(lines[number]) && (isRest || !keyword.empty());
    }
    return found;
}

std::vector<std::string> interfacesFiles() {
    std::vector<std::string> files{kMainFile};
    for (std::size_t next = 0; next < files.size(); ++next) {
        for (const std::string& line : splitLines(smallFile(files[next]).value_or(""))) {
            if (!keywordOf(line).starts_with("source")) {
                continue;
            }
            for (std::string& path : namedBy(files[next], line)) {
                if (files.size() < kMostFiles && std::ranges::find(files, path) == files.end()) {
                    files.push_back(std::move(path));
                }
            }
        }
    }
    return files;
}

std::vector<std::string> splitLines(const std::string& text) {
    std::vector<std::string> lines;
    std::istringstream in(text);
    for (std::string line; std::getline(in, line);) {
        lines.push_back(std::move(line));
    }
    return lines;
}

std::string joined(const std::vector<std::string>& lines, const std::string& like) {
    std::string text;
    for (const std::string& line : lines) {
        text += line + '\n';
    }
    if (!text.empty() && !like.empty() && !like.ends_with('\n')) {
        text.pop_back();
    }
    return text;
}

}  // namespace cvagent::keep
