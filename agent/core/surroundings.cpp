#include "agent/core/surroundings.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <cstring>

#include "agent/core/problem.h"
#include "agent/core/text.h"
#include "framework/qx/corvista_utilities.h"

namespace cvagent {

namespace {

constexpr const char* kDataVariable = "CORVISTA_DATA_DIR";

std::atomic<int> keptStandardError{STDERR_FILENO};

bool hasDirectory(const std::string& path, const std::string& directory) {
    return (":" + path + ":").find(":" + directory + ":") != std::string::npos;
}

/// Makes a directory and those above it; only the last one is kept from other users.
bool makeDirectory(const std::string& path) {
    for (std::size_t slash = path.find('/', 1); slash != std::string::npos;
         slash = path.find('/', slash + 1)) {
        const bool isLast = slash + 1 == path.size();
        if (mkdir(path.substr(0, slash).c_str(), isLast ? 0700 : 0755) != 0 && errno != EEXIST) {
            return false;
        }
    }
    return true;
}

/// @return a descriptor, or -1 with errno
int openDirectory(const std::string& path) {
    return makeDirectory(path) ? open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC) : -1;
}

std::string standardDirectory() {
    const char* path = QX::CorvistaUtilities::getMoraineDataDir();
    return path != nullptr ? path : "";
}

/// Where a user who may not write to the standard place keeps the data; "" when there is no home.
std::string userDirectory() {
    const char* state = std::getenv("XDG_STATE_HOME");
    const char* home = std::getenv("HOME");
    if (state != nullptr && *state == '/') {
        return std::string(state) + "/corvista/data/";
    }
    return home != nullptr && *home == '/' ? std::string(home) + "/.local/state/corvista/data/" : "";
}

[[noreturn]] void failToOpen(const std::string& path, int error) {
    throw Problem(Problem::failed, "cannot use the data directory " + inQuotes(path) + ": " +
                                       std::strerror(error) + "\nRun as root, or name another one with " +
                                       kDataVariable + "=DIRECTORY");
}

}  // namespace

void prepareSurroundings() {
    setenv("LC_ALL", "C", 1);
    const char* variable = std::getenv("PATH");
    std::string path = variable != nullptr ? variable : "";
    for (const char* directory : {"/usr/local/sbin", "/usr/sbin", "/sbin", "/usr/bin", "/bin"}) {
        if (!hasDirectory(path, directory)) {
            path += (path.empty() ? "" : ":") + std::string(directory);
        }
    }
    setenv("PATH", path.c_str(), 1);
    struct sigaction standard {};
    standard.sa_handler = SIG_DFL;
    sigaction(SIGCHLD, &standard, nullptr);
}

DataDirectory::DataDirectory() {
    const char* chosen = std::getenv(kDataVariable);
    if (chosen != nullptr && *chosen == '\0') {
        throw Problem(Problem::refused,
                      std::string(kDataVariable) + " is empty; set it to a directory or unset it",
                      Problem::environment);
    }
    path_ = chosen == nullptr && geteuid() != 0 ? userDirectory() : standardDirectory();
    if (path_.empty()) {
        throw Problem(Problem::failed, std::string("there is no place for data; set ") + kDataVariable +
                                           "=DIRECTORY or run as root");
    }
    if (chosen == nullptr && geteuid() != 0) {
        setenv(kDataVariable, path_.c_str(), 1);
    }
    descriptor_ = openDirectory(path_);
    if (descriptor_ < 0) {
        failToOpen(path_, errno);
    }
    if (flock(descriptor_, LOCK_EX | LOCK_NB) != 0) {
        const int error = errno;
        close(descriptor_);
        if (error != EWOULDBLOCK) {
            failToOpen(path_, error);
        }
        throw Problem(Problem::busy, "another agent holds the data directory " + inQuotes(path_) +
                                         "\nStop it first, or give this one a directory of its own with " +
                                         kDataVariable + "=DIRECTORY");
    }
}

DataDirectory::~DataDirectory() {
    close(descriptor_);  // the lock goes with it
}

QuietCommands::QuietCommands() {
    const int nowhere = open("/dev/null", O_WRONLY | O_CLOEXEC);
    const int kept = fcntl(STDERR_FILENO, F_DUPFD_CLOEXEC, STDERR_FILENO + 1);
    if (nowhere >= 0 && kept >= 0) {
        dup2(nowhere, STDERR_FILENO);
        keptStandardError = kept;
    } else if (kept >= 0) {
        close(kept);
    }
    if (nowhere >= 0) {
        close(nowhere);
    }
}

QuietCommands::~QuietCommands() {
    const int kept = keptStandardError.exchange(STDERR_FILENO);
    if (kept != STDERR_FILENO) {
        dup2(kept, STDERR_FILENO);
        close(kept);
    }
}

int messageDescriptor() {
    return keptStandardError;
}

namespace {

/// Why no file can be written below /tmp, as an errno; 0 when one can.
int temporaryFileProblem() {
    std::string name = "/tmp/cvagent-XXXXXX";
    const int file = mkostemp(name.data(), O_CLOEXEC);
    if (file < 0) {
        return errno;
    }
    const std::string page(4096, ' ');
    const int error = write(file, page.data(), page.size()) == static_cast<ssize_t>(page.size()) ? 0 : errno;
    close(file);
    unlink(name.c_str());
    return error;
}

}  // namespace

std::string hintAtReadOnly(const DataDirectory& data) {
    if (access(data.path().c_str(), W_OK) == 0) {
        return {};
    }
    return "cannot write to the data directory " + inQuotes(data.path()) + ": " + std::strerror(errno) +
           "; the owner's data cannot be changed, and a change of a link is told again and again";
}

std::string hintAtTemporaryFiles() {
    const int error = temporaryFileProblem();
    return error == 0 ? std::string()
                      : std::string("cannot write to /tmp: ") + std::strerror(error) +
                            "; drives, partitions and network ports can be missing";
}

std::string hintAtRoot(const DataDirectory& data) {
    if (geteuid() == 0) {
        return {};
    }
    return "without root some facts will be missing: partition tables of disks, Wake-on-LAN of network "
           "ports, "
           "files that only root reads. Nothing of the host can be changed. Data is kept in " +
           data.path();
}

}  // namespace cvagent
