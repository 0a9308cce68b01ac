#include "agent/change/directory.h"

#include <dirent.h>
#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <climits>

namespace cvagent::change {

std::vector<std::string> namesIn(int directory) {
    std::vector<std::string> names;
    const int readable = openat(directory, ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    DIR* const list = readable < 0 ? nullptr : fdopendir(readable);
    if (list == nullptr) {
        return names;
    }
    while (const dirent* entry = readdir(list)) {
        names.emplace_back(static_cast<const char*>(entry->d_name));
    }
    closedir(list);
    std::erase(names, ".");
    std::erase(names, "..");
    std::ranges::sort(names);
    return names;
}

std::string targetOf(int directory, const std::string& name) {
    std::array<char, PATH_MAX> target{};
    const ssize_t size = readlinkat(directory, name.c_str(), target.data(), target.size());
    return size <= 0 ? "" : std::string(target.data(), static_cast<std::size_t>(size));
}

}  // namespace cvagent::change
