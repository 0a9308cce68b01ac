#include "tests/support/files.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "tests/support/system_call.h"

namespace fake_host {

std::optional<std::string> readFile(const std::string& path) {
    int file = open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (file < 0) return std::nullopt;
    std::string content;
    char block[4096];
    ssize_t got;
    while ((got = ::read(file, block, sizeof block)) > 0) content.append(block, static_cast<size_t>(got));
    close(file);
    if (got < 0) return std::nullopt;
    return content;
}

void writeFile(const std::string& path, const std::string& content, mode_t mode) {
    makeParents(path);
    int file = must(open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0600), "create " + path);
    ssize_t put = ::write(file, content.data(), content.size());
    int changed = fchmod(file, mode);
    close(file);
    must(changed, "set the mode of " + path);
    if (put != static_cast<ssize_t>(content.size())) must(-1, "write " + path);
}

void makeDirectories(const std::string& path) {
    if (mkdir(path.c_str(), 0755) == 0 || errno == EEXIST) return;
    if (errno == ENOENT) {
        makeParents(path);
        must(mkdir(path.c_str(), 0755), "create " + path);
        return;
    }
    must(-1, "create " + path);
}

void makeParents(const std::string& path) {
    size_t slash = path.find_last_of('/');
    if (slash != std::string::npos && slash > 0) makeDirectories(path.substr(0, slash));
}

}  // namespace fake_host
