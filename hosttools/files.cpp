#include "hosttools/files.h"

#include <dirent.h>
#include <fcntl.h>
#include <unistd.h>
#include <algorithm>
#include <cerrno>
#include <charconv>
#include <memory>

#include "hosttools/descriptor.h"

namespace hosttools {

std::optional<std::string> readFile(const std::string& path) {
    const Descriptor file(open(path.c_str(), O_RDONLY | O_CLOEXEC));
    if (!file.isOpen()) return std::nullopt;
    std::string content;
    for (;;) {
        const std::size_t used = content.size();
        const std::size_t step = std::max<std::size_t>(4096, used);
        content.resize(used + step);
        const ssize_t got = read(file.get(), content.data() + used, step);
        content.resize(used + (got > 0 ? static_cast<std::size_t>(got) : 0));
        if (got == 0) return content;
        if (got < 0 && errno != EINTR) return std::nullopt;
    }
}

std::string readFirstLine(const std::string& path) {
    const std::string content = readFile(path).value_or("");
    return content.substr(0, content.find('\n'));
}

std::uint64_t readNumber(const std::string& path, std::uint64_t fallback) {
    const auto content = readFile(path);
    return content ? parseNumber(*content).value_or(fallback) : fallback;
}

std::optional<std::uint64_t> takeNumber(std::string_view& text, int base) {
    const std::size_t prefix = base == 16 && text.starts_with("0x") ? 2 : 0;
    std::uint64_t value = 0;
    const auto end = std::from_chars(text.data() + prefix, text.data() + text.size(), value, base);
    if (end.ec != std::errc()) return std::nullopt;
    text.remove_prefix(static_cast<std::size_t>(end.ptr - text.data()));
    return value;
}

std::optional<std::uint64_t> parseNumber(std::string_view text, int base) {
    return takeNumber(text, base);
}

std::vector<std::string> listDirectory(const std::string& path) {
    std::vector<std::string> names;
    const std::unique_ptr<DIR, int (*)(DIR*)> directory(opendir(path.c_str()), closedir);
    if (!directory) return names;
    while (const dirent* entry = readdir(directory.get())) {
        const std::string_view name = entry->d_name;
        if (name != "." && name != "..") names.emplace_back(name);
    }
    return names;
}

std::string_view takeLine(std::string_view& text) {
    const std::size_t end = text.find('\n');
    const std::string_view line = text.substr(0, end);
    text.remove_prefix(end == std::string_view::npos ? text.size() : end + 1);
    return line;
}

std::string_view takeWord(std::string_view& text) {
    const std::size_t begin = text.find_first_not_of(" \t");
    text.remove_prefix(begin == std::string_view::npos ? text.size() : begin);
    const std::string_view word = text.substr(0, text.find_first_of(" \t"));
    text.remove_prefix(word.size());
    return word;
}

}  // namespace hosttools
