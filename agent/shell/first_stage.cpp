#include "agent/shell/first_stage.h"

#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <utility>

#include "agent/shell/adapters.h"
#include "agent/shell/filters/filters.h"
#include "agent/shell/local_file.h"
#include "agent/shell/starts.h"

namespace cvagent::shell {

namespace {

constexpr int kNotFound = 127;
/// A larger one is for a process to read: it takes long, and a process can be killed.
constexpr off_t kLargestFile = 64L << 20U;
/// grep looks for zeros in as much as it reads at a time, which differs between its releases.
constexpr off_t kLargestForGrep = 32L << 10U;

bool isNullDevice(const struct stat& file) {
    constexpr unsigned kMemoryDevices = 1;
    constexpr unsigned kNull = 3;
    return S_ISCHR(file.st_mode) && file.st_rdev == makedev(kMemoryDevices, kNull);
}

/// Whether nobody sees what this process and its children print to standard error.
bool complaintsGoNowhere() {
    struct stat file {};
    return fstat(STDERR_FILENO, &file) == 0 && isNullDevice(file);
}

FirstStage refused() {
    return {{Outcome::refused}};
}

FirstStage answered(std::unique_ptr<Source> source) {
    return {{}, std::move(source)};
}

class FileSource : public Source {
public:
    /// @param complaint what the tool says before the reason when it cannot read on; "" for nothing
    /// @param isGreps grep reads it itself, and ends by it
    FileSource(hosttools::Descriptor file, std::string complaint, bool isGreps)
        : file_(std::move(file)), complaint_(std::move(complaint)), isGreps_(isGreps) {}
    bool pull(std::string& out) override {
        const std::size_t before = out.size();
        out.resize(before + kChunk);
        const ssize_t got = read(file_.get(), out.data() + before, kChunk);
        failed_ = got < 0;
        if (failed_ && !complaint_.empty()) {
            const std::string text = complaint_ + std::strerror(errno) + '\n';
            [[maybe_unused]] const ssize_t written = write(STDERR_FILENO, text.data(), text.size());
        }
        out.resize(before + (got > 0 ? static_cast<std::size_t>(got) : 0));
        read_ += std::max<ssize_t>(got, 0);
        // What grows while it is read must not hold this thread, which nobody can kill.
        status_ = failed_ || read_ > kLargestFile ? 1 : 0;
        return got > 0 && read_ <= kLargestFile;
    }
    bool failed() const override { return failed_ && isGreps_; }
    int status() const override { return status_; }

private:
    hosttools::Descriptor file_;
    std::string complaint_;
    bool isGreps_;
    bool failed_ = false;
    off_t read_ = 0;
    int status_ = 0;
};

/// A shell's own echo takes backslashes for more than they are, and words such as -n.
FirstStage echo(Words words) {
    std::string text;
    for (const std::string& word : words) {
        if (word.find('\\') != std::string::npos || words.front().starts_with('-')) {
            return refused();
        }
        text += (&word == words.data() ? "" : " ") + word;
    }
    return answered(std::make_unique<TextSource>(text + '\n'));
}

/// A name that a tool's complaint and its options leave as it is, and that is the same file to the tool.
bool isPlainPath(const std::string& path) {
    return path.starts_with('/') && !path.starts_with("/proc/self") && !path.starts_with("/proc/thread-self");
}

FirstStage fileOr(const std::string& path, std::unique_ptr<Filter> filter, Manner manner,
                  int statusWhenMissing, off_t most) {
    if (manner.busybox && !manner.silent) {
        return {};
    }
    LocalFile file = openForReading(path, most);
    // Why there is nothing to read decides how busybox's grep ends.
    const bool sameEnd = filter == nullptr || !manner.busybox;
    if (file.outcome == LocalFile::missing && manner.silent && sameEnd) {
        return answered(std::make_unique<TextSource>("", statusWhenMissing));
    }
    if (file.outcome == LocalFile::large) {
        return {};
    }
    if (file.outcome != LocalFile::opened) {
        return refused();
    }
    const bool isGreps = filter != nullptr;
    const std::string complaint = manner.silent ? "" : (isGreps ? "grep: " : "cat: ") + path + ": ";
    auto source = std::make_unique<FileSource>(std::move(file.descriptor), complaint, isGreps);
    if (filter == nullptr) {
        return answered(std::move(source));
    }
    filter->readFrom(std::move(source));
    return answered(std::move(filter));
}

FirstStage catFile(Words words, Manner manner) {
    return words.size() == 1 && isPlainPath(words.front())
               ? fileOr(words.front(), nullptr, manner, 1, kLargestFile)
               : FirstStage{};
}

FirstStage grepFile(Words words, Manner manner, Dialect dialect) {
    if (words.size() < 2 || !isPlainPath(words.back())) {
        return {};
    }
    auto filter = makeGrepOf(words.back(), words.first(words.size() - 1), dialect, manner);
    return filter != nullptr ? fileOr(words.back(), std::move(filter), manner, 2, kLargestForGrep)
                             : FirstStage{};
}

FirstStage basicGrepFile(Words words, Manner manner) {
    return grepFile(words, manner, Dialect::basic);
}

FirstStage extendedGrepFile(Words words, Manner manner) {
    return grepFile(words, manner, Dialect::extended);
}

/// `rm FILE` and `rm -rf FILE`. What rm would ask before is not done here.
FirstStage removeFile(Words words, Manner manner) {
    const bool force = !words.empty() && words.front() == "-rf";
    words = words.subspan(force ? 1 : 0);
    if (words.size() != 1 || !isPlainPath(words.front())) {
        return {};
    }
    const std::string& path = words.front();
    const LocalFile::Outcome found = removable(path);
    if (found == LocalFile::missing && (force || manner.silent)) {
        return answered(std::make_unique<TextSource>("", force ? 0 : 1));
    }
    const bool asks = !force && isatty(STDIN_FILENO) != 0 && access(path.c_str(), W_OK) != 0;
    if (found != LocalFile::opened || asks || path.ends_with('/') || unlink(path.c_str()) != 0) {
        return refused();
    }
    return answered(std::make_unique<TextSource>(""));
}

struct FileTool {
    std::string_view name;
    FirstStage (*stage)(Words words, Manner manner);
};
constexpr auto kFileTools = std::to_array<FileTool>(
    {{"cat", catFile}, {"egrep", extendedGrepFile}, {"grep", basicGrepFile}, {"rm", removeFile}});

/// @return without a source where the tool itself has to run
FirstStage standIn(const FirstStageRequest& request, const Program& program, bool silent) {
    const Words words = Words(request.words).subspan(1);
    if (!request.isRead && request.words.front() != "rm") {
        return {};
    }
    if (program.kind == Program::adapter) {
        return {{}, askAdapter(request.words.front(), words, silent)};
    }
    for (const FileTool& tool : kFileTools) {
        // What busybox says of a write that fails is its own.
        const bool busybox = program.kind == Program::busybox && request.output < 0;
        if ((busybox || program.kind == Program::known) && tool.name == request.words.front()) {
            return tool.stage(words, {silent, busybox});
        }
    }
    return {};
}

FirstStage startProcess(const FirstStageRequest& request, const std::string& path,
                        std::vector<std::string> words) {
    auto process = std::make_unique<ProcessSource>();
    const ProcessStart start{path, std::move(words), request.silent, request.command};
    const int error = request.output >= 0 ? process->startInto(start, request.output) : process->start(start);
    if (error == EAGAIN || error == ENOMEM || error == EMFILE || error == ENFILE) {
        countNotStarted(error);
        return {{Outcome::failed, error}};
    }
    if (error != 0) {
        return refused();
    }
    ProcessSource* const started = process.get();
    return {{}, std::move(process), started};
}

}  // namespace

bool nullDeviceIsThere() {
    struct stat file {};
    return stat("/dev/null", &file) == 0 && isNullDevice(file);
}

FirstStage startFirstStage(const FirstStageRequest& request, ProgramSearch& programs) {
    if (request.words.front() == "echo") {
        return !request.isRead ? refused() : echo(Words(request.words).subspan(1));
    }
    const bool silent = request.silent || complaintsGoNowhere();
    const Program program = programs.find(request.words.front());
    if (program.kind == Program::missing && silent) {
        return answered(std::make_unique<TextSource>("", kNotFound));
    }
    if (program.kind == Program::missing || program.kind == Program::unclear) {
        return refused();
    }
    FirstStage stage = standIn(request, program, silent);
    const bool done = stage.source != nullptr || stage.outcome.kind != Outcome::started;
    return done ? std::move(stage) : startProcess(request, program.path, request.words);
}

FirstStage startShell(const FirstStageRequest& request, const std::string& text,
                      const std::string& argument) {
    return startProcess(request, "/bin/sh", {"sh", "-c", "--", text, "sh", argument});
}

}  // namespace cvagent::shell
