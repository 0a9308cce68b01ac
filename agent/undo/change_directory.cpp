#include "agent/undo/change_directory.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>

#include "hosttools/files.h"
#include "hosttools/text.h"

namespace cvagent::undo {

namespace {

using hosttools::Descriptor;

// That are kept for looking back.
constexpr unsigned kMostChanges = 50;
constexpr off_t kMostBytes = off_t{64} << 20U;
constexpr unsigned kLargestNumber = 999'999'999;
constexpr off_t kMostSaved = off_t{256} << 20U;
constexpr const char* kJournal = "journal";
constexpr const char* kJournalLock = "journal.lock";

[[noreturn]] void failWith(const std::string& what) {
    throw ChangeError(what + ": " + std::strerror(errno));
}

int tried(int result, const std::string& what) {
    if (result < 0) {
        failWith(what);
    }
    return result;
}

void judge(int handle, const std::string& what) {
    struct stat found {};
    tried(fstat(handle, &found), what);
    if (found.st_uid != geteuid() || (found.st_mode & (S_IWGRP | S_IWOTH)) != 0) {
        throw ChangeError(what + " is not its owner's alone");
    }
}

Descriptor openPlace(const std::string& place) {
    Descriptor opened(open(place.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
    tried(opened.get(), place);
    judge(opened.get(), place);
    return opened;
}

std::string missing(unsigned number) {
    return "there is no change " + std::to_string(number);
}

Descriptor openChange(int place, unsigned number) {
    const std::string name = std::to_string(number);
    Descriptor opened(openat(place, name.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
    if (!opened.isOpen() && errno == ENOENT) {
        throw ChangeError(missing(number));
    }
    tried(opened.get(), "the change " + name);
    judge(opened.get(), "the change " + name);
    return opened;
}

struct flock wholeFile() {
    struct flock all {};
    all.l_type = F_WRLCK;
    all.l_whence = SEEK_SET;
    return all;
}

/// The journal first: without it there is no change.
constexpr std::array kFiles = {kJournal,  "before",   "left",      "began",     kAgentLock,
                               kStepLock, kGuardLock, kTakingLock, kJournalLock};

off_t sizeOfChange(int place, unsigned number) {
    off_t size = 0;
    for (const char* each : kFiles) {
        struct stat found {};
        const std::string path = std::to_string(number) + "/" + each;
        size += fstatat(place, path.c_str(), &found, AT_SYMLINK_NOFOLLOW) == 0 ? found.st_size : 0;
    }
    return size;
}

/// Who cannot be read stays, for nobody knows whether something waits for it.
bool hasEnded(const std::string& place, unsigned number) {
    try {
        const ChangeDirectory change(place, number);
        const auto journal = change.journal();
        return !(journal && journal->isOpen()) && !change.isTaken(kAgentLock);
    } catch (const ChangeError&) {
        return false;
    }
}

/// What is saved of old changes is for people; of those that are under way nothing goes.
void makeRoom(const std::string& place, int opened) {
    const std::vector<unsigned> numbers = changesIn(place);
    off_t size = 0;
    for (const unsigned number : numbers) {
        size += sizeOfChange(opened, number);
    }
    for (std::size_t i = 0; i < numbers.size() && (numbers.size() - i > kMostChanges || size > kMostBytes);
         ++i) {
        if (hasEnded(place, numbers[i])) {
            size -= sizeOfChange(opened, numbers[i]);
            ChangeDirectory(place, numbers[i]).remove();
        }
    }
}

}  // namespace

std::optional<unsigned> changeNumber(std::string_view word) {
    const auto number = hosttools::takeNumber(word);
    const bool isOne = number && word.empty() && *number > 0 && *number <= kLargestNumber;
    return isOne ? std::optional(static_cast<unsigned>(*number)) : std::nullopt;
}

std::vector<unsigned> changesIn(const std::string& place) {
    std::vector<unsigned> numbers;
    for (const std::string& name : hosttools::listDirectory(place)) {
        const auto number = changeNumber(name);
        if (number && std::to_string(*number) == name) {
            numbers.push_back(*number);
        }
    }
    std::ranges::sort(numbers);
    return numbers;
}

ChangeDirectory::ChangeDirectory(const std::string& place, unsigned number) : number_(number) {
    if (access(place.c_str(), F_OK) != 0 && errno == ENOENT) {
        throw ChangeError(missing(number));  // none was made so far
    }
    directory_ = openChange(openPlace(place).get(), number);
}

Descriptor ChangeDirectory::lockPlace(const std::string& place) {
    Descriptor opened = openPlace(place);
    while (flock(opened.get(), LOCK_EX) != 0) {
        if (errno != EINTR) {
            failWith(place);
        }
    }
    return opened;
}

ChangeDirectory ChangeDirectory::make(const std::string& place) {
    const Descriptor opened = openPlace(place);
    makeRoom(place, opened.get());
    for (;;) {
        const std::vector<unsigned> numbers = changesIn(place);
        const unsigned next = numbers.empty() ? 1 : numbers.back() + 1;
        if (next > kLargestNumber) {
            throw ChangeError(place + " has no number left");
        }
        if (mkdirat(opened.get(), std::to_string(next).c_str(), 0700) == 0) {
            tried(fsync(opened.get()), place);
            return {openChange(opened.get(), next), next};
        }
        if (errno != EEXIST) {
            failWith(place);
        }
    }
}

void ChangeDirectory::remove() const {
    for (const char* each : kFiles) {
        unlinkat(directory_.get(), each, 0);
        unlinkat(directory_.get(), (std::string(each) + ".new").c_str(), 0);
    }
    const Descriptor place(openat(directory_.get(), "..", O_PATH | O_DIRECTORY | O_CLOEXEC));
    unlinkat(place.get(), std::to_string(number_).c_str(), AT_REMOVEDIR);
}

bool ChangeDirectory::isGone() const {
    struct stat found {};
    return fstat(directory_.get(), &found) == 0 && found.st_nlink == 0;
}

std::optional<Journal> ChangeDirectory::journal() const {
    const auto text = read(kJournal);
    try {
        return text ? std::optional(journalFrom(*text)) : std::nullopt;
    } catch (const BadRecord& bad) {
        throw ChangeError(std::string("the journal cannot be read: ") + bad.what());
    }
}

Journal ChangeDirectory::update(const std::function<bool(Journal&)>& change) const {
    const Descriptor alone = lock(kJournalLock, F_OFD_SETLKW);
    Journal now = journal().value_or(Journal{});
    if (change(now)) {
        write(kJournal, textOf(now));
    }
    return now;
}

std::optional<SavedState> ChangeDirectory::load(const char* name) const {
    const auto text = read(name);
    try {
        return text ? std::optional(savedStateFrom(*text)) : std::nullopt;
    } catch (const BadRecord& bad) {
        throw ChangeError(std::string("what was saved cannot be read: ") + bad.what());
    }
}

void ChangeDirectory::save(const char* name, const SavedState& state) const {
    write(name, textOf(state));
}

Descriptor ChangeDirectory::take(const char* name) const {
    return lock(name, F_OFD_SETLK);
}

Descriptor ChangeDirectory::waitFor(const char* name) const {
    return lock(name, F_OFD_SETLKW);
}

/// Without taking it for a moment, which would turn away who comes then.
bool ChangeDirectory::isTaken(const char* name) const {
    const Descriptor file = openLock(name);
    struct flock wanted = wholeFile();
    tried(fcntl(file.get(), F_OFD_GETLK, &wanted), name);
    return wanted.l_type != F_UNLCK;
}

std::optional<std::string> ChangeDirectory::read(const char* name) const {
    const Descriptor file(openat(directory_.get(), name, O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
    if (!file.isOpen() && errno == ENOENT) {
        return std::nullopt;
    }
    struct stat found {};
    tried(file.get(), name);
    tried(fstat(file.get(), &found), name);
    if (!S_ISREG(found.st_mode) || found.st_size > kMostSaved) {
        throw ChangeError(std::string(name) + " is no file of ours");
    }
    std::string text(static_cast<std::size_t>(found.st_size), '\0');
    for (std::size_t at = 0; at < text.size();) {
        const ssize_t got = ::read(file.get(), text.data() + at, text.size() - at);
        if (got == 0 || (got < 0 && errno != EINTR)) {
            throw ChangeError(std::string(name) + " cannot be read");
        }
        at += got > 0 ? static_cast<std::size_t>(got) : 0;
    }
    return text;
}

void ChangeDirectory::write(const char* name, std::string_view text) const {
    const std::string next = std::string(name) + ".new";
    unlinkat(directory_.get(), next.c_str(), 0);
    const Descriptor file(
        openat(directory_.get(), next.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0600));
    tried(file.get(), next);
    const bool isThere = hosttools::writeAll(file.get(), text) && fsync(file.get()) == 0 &&
                         renameat(directory_.get(), next.c_str(), directory_.get(), name) == 0;
    if (!isThere) {
        const int problem = errno;
        unlinkat(directory_.get(), next.c_str(), 0);  // what there was no room for takes none away
        errno = problem;
        failWith("the change cannot be written down: " + std::string(name));
    }
    tried(fsync(directory_.get()), name);
}

Descriptor ChangeDirectory::openLock(const char* name) const {
    Descriptor file(openat(directory_.get(), name, O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC, 0600));
    tried(file.get(), name);
    return file;
}

Descriptor ChangeDirectory::lock(const char* name, int how) const {
    Descriptor file = openLock(name);
    struct flock wanted = wholeFile();
    while (fcntl(file.get(), how, &wanted) != 0) {
        if (errno == EAGAIN || errno == EACCES) {
            return {};
        }
        if (errno != EINTR) {
            failWith(name);
        }
    }
    return file;
}

}  // namespace cvagent::undo
