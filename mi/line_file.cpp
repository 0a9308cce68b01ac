#include "mi/line_file.h"

#include <fcntl.h>
#include <sys/resource.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <string_view>
#include <system_error>
#include <utility>

#include "mi/log.h"

namespace IC {

namespace {

/// A file whose content is replaced where it stands: it keeps its owner, its rights and its links.
class File {
public:
    explicit File(const std::string& path)
        : descriptor_(open(path.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0666)) {}
    File(const File&) = delete;
    File& operator=(const File&) = delete;
    ~File() {
        if (opened()) {
            close(descriptor_);
        }
    }

    bool opened() const { return descriptor_ >= 0; }

    /// Whether there is room for `size` bytes; nothing is changed. True where the file system cannot tell:
    /// then the write itself shows it.
    bool hasRoom(std::size_t size) const { return size == 0 || (fitsTheLimit(size) && isThereRoom(size)); }

    /// Empties the file, then writes the content. A process that is killed in between leaves the beginning of
    /// the new content and nothing of the old one.
    bool put(std::string_view content) const {
        // Fails where there is no regular file, which has no length either.
        [[maybe_unused]] const int ignored = ftruncate(descriptor_, 0);
        while (!content.empty()) {
            const ssize_t written = ::write(descriptor_, content.data(), content.size());
            if (written < 0 && errno == EINTR) {
                continue;
            }
            if (written <= 0) {
                return false;
            }
            content.remove_prefix(static_cast<std::size_t>(written));
        }
        return true;
    }

private:
    /// Asked first: a process that writes beyond its limit is ended by SIGXFSZ, when the file is empty
    /// already.
    static bool fitsTheLimit(std::size_t size) {
        rlimit limit{};
        return getrlimit(RLIMIT_FSIZE, &limit) != 0 || limit.rlim_cur == RLIM_INFINITY ||
               size <= limit.rlim_cur;
    }
    bool isThereRoom(std::size_t size) const {
        return fallocate(descriptor_, FALLOC_FL_KEEP_SIZE, 0, static_cast<off_t>(size)) == 0 ||
               (errno != ENOSPC && errno != EDQUOT);
    }

    int descriptor_;
};

bool isDirectory(const std::string& path) {
    std::error_code unknown;
    return std::filesystem::is_directory(path, unknown);
}

}  // namespace

std::optional<LineFile> LineFile::read(const std::string& path) {
    std::ifstream in(path);
    if (!in) {
        return std::nullopt;
    }
    LineFile file;
    for (std::string line; std::getline(in, line);) {
        file.lines_.push_back(in.eof() ? line : line + '\n');
    }
    return in.bad() && !isDirectory(path) ? std::nullopt : std::optional(std::move(file));
}

void LineFile::endLastLine() {
    if (!lines_.empty() && !lines_.back().ends_with('\n')) {
        lines_.back() += '\n';
    }
}

void LineFile::append(const std::string& line) {
    endLastLine();
    lines_.push_back(line);
}

void LineFile::prepend(const std::string& line) {
    lines_.insert(lines_.begin(), line);
}

std::string LineFile::text() const {
    std::string content;
    for (const std::string& line : lines_) {
        content += line;
    }
    return content;
}

LineFile::Written LineFile::replace(const std::string& path, const std::function<void()>& opened) const {
    const std::string content = text();
    const File file(path);
    if (!file.opened()) {
        return Written::notOpened;
    }
    if (opened) {
        opened();
    }
    if (file.hasRoom(content.size()) && file.put(content)) {
        return Written::whole;
    }
    log(kError) << "Could not write all of '" << path << "'.";
    return Written::notWhole;
}

}  // namespace IC
