#include "agent/core/catalogue_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <filesystem>
#include <mutex>
#include <optional>
#include <set>

#include "agent/core/plugin_files.h"
#include "agent/core/text.h"

namespace cvagent {

namespace {

namespace fs = std::filesystem;

constexpr std::size_t kLongestFile = 1UL << 20U;
constexpr std::string_view kLibraryEnding = ".so";

struct CatalogueContent {
    std::optional<std::string> text;  ///< nothing where there is no file, or it cannot be used
    std::string complaint;
};

/// @return one byte more than the longest when there is more
std::string readWhole(int file) {
    struct stat found {};
    const bool sized = fstat(file, &found) == 0 && found.st_size < static_cast<off_t>(kLongestFile);
    std::string text(sized ? static_cast<std::size_t>(found.st_size) : kLongestFile + 1, '\0');
    std::size_t size = 0;
    for (ssize_t more = 1; more > 0 && size < text.size(); size += static_cast<std::size_t>(more)) {
        more = std::max<ssize_t>(read(file, text.data() + size, text.size() - size), 0);
    }
    text.resize(size);
    return text;
}

/// Nothing of a pipe or a device is waited for.
CatalogueContent readCatalogue(const std::string& path) {
    std::error_code error;
    const std::string target = fs::canonical(path, error);
    if (error) {
        const bool none = error == std::errc::no_such_file_or_directory && !fs::is_symlink(path);
        return {std::nullopt, none ? "" : "it leads nowhere"};
    }
    if (std::string reason = whyUnsafe(target); !reason.empty()) {
        return {std::nullopt, reason};
    }
    const int file = open(target.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOFOLLOW);
    if (file < 0) {
        return {std::nullopt, std::string("it cannot be read: ") + std::strerror(errno)};
    }
    CatalogueContent content{readWhole(file), ""};
    close(file);
    if (content.text->size() > kLongestFile) {
        return {std::nullopt, "it has more than a MiB"};
    }
    return content;
}

std::string complaintsText(const std::vector<std::string>& complaints) {
    std::string all;
    for (const std::string& complaint : complaints) {
        all += (all.empty() ? "" : "; ") + complaint;
    }
    return all;
}

}  // namespace

std::string catalogueFileOf(const std::string& plugin) {
    const fs::path file = plugin;
    const std::string name = file.filename();
    const std::size_t end = name.rfind(kLibraryEnding);
    return file.parent_path() / (name.substr(0, end) + ".json");
}

void loadCatalogueOf(const std::string& plugin, const Tell& tell) {
    static std::mutex guard;              // two files must not both find the same number free
    static std::set<std::string> loaded;  // another agent in the process finds it there
    const std::lock_guard lock(guard);
    const std::string path = catalogueFileOf(plugin);
    const CatalogueContent content = readCatalogue(path);
    const std::string head = "the names in '" + printable(path) + "' are ";
    if (!content.complaint.empty()) {
        tell(head + "left out: " + content.complaint);
    }
    if (!content.text || !loaded.insert(path).second) {
        return;
    }
    const ParsedCatalogue parsed = parseCatalogue(path, *content.text);
    if (!parsed.complaints.empty()) {
        tell(head + (parsed.table == nullptr ? "left out: " : "used but for some: ") +
             complaintsText(parsed.complaints));
    }
    if (parsed.table != nullptr) {
        addToCatalogue(*parsed.table);
    }
}

}  // namespace cvagent
