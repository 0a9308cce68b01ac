#include "tests/support/fake_host.h"

#include <fcntl.h>
#include <net/if.h>
#include <sys/ioctl.h>
#include <sys/mount.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cstring>
#include <filesystem>

#include "tests/support/files.h"
#include "tests/support/mounts.h"
#include "tests/support/system_call.h"
#include "tests/support/tool_files.h"
#include "tests/support/world.h"

namespace fs = std::filesystem;
using namespace fake_host;

namespace {

void bringLoopbackUp() {
    int handle = must(socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0), "open a socket");
    ifreq request{};
    std::strcpy(request.ifr_name, "lo");
    request.ifr_flags = IFF_UP | IFF_RUNNING;
    int done = ioctl(handle, SIOCSIFFLAGS, &request);
    close(handle);
    must(done, "bring the loopback up");
}

// A descriptor of an unlinked file that takes all the space there is below the directory.
int fillDisk(const std::string& directory) {
    int file = must(open(directory.c_str(), O_TMPFILE | O_RDWR | O_CLOEXEC, 0600), "fill " + directory);
    const std::string page(4096, 'x');
    while (write(file, page.data(), page.size()) > 0) {
    }
    return file;
}

// Parts of a recorded host that are no files of its root directory.
bool installsSpecially(const fs::path& name) {
    return name == "tools" || name == "hostname" || name == "README.md" ||
           name.string().rfind("expected", 0) == 0;
}

}  // namespace

FakeHost::FakeHost() {
    makeDirectories(turnsDirectory);
    makeDirectories(answerDirectory);
    writeFile(clockFile, "");
    for (const char* name : {"shutdown", "reboot", "halt", "poweroff", "service", "rpm", "hwclock"})
        recordOnly(name);
}

FakeHost::~FakeHost() {
    for (int file : ballast_) close(file);
    if (unrecordedExpected_) return;
    for (const std::string& call : unrecorded())
        ADD_FAILURE() << "no answer is recorded for the tool call: " << call;
}

void FakeHost::file(const std::string& path, const std::string& content, mode_t mode) {
    writeFile(path, content, mode);
}

void FakeHost::directory(const std::string& path, mode_t mode) {
    makeDirectories(path);
    must(chmod(path.c_str(), mode), "set the mode of " + path);
}

void FakeHost::symlink(const std::string& path, const std::string& target) {
    makeParents(path);
    must(::symlink(target.c_str(), path.c_str()), "link " + path);
}

bool FakeHost::giveToStranger(const std::string& path) {
    return lchown(path.c_str(), stranger, stranger) == 0;
}

void FakeHost::remove(const std::string& path) {
    fs::remove_all(path);
}

std::optional<std::string> FakeHost::read(const std::string& path) const {
    return readFile(path);
}

bool FakeHost::exists(const std::string& path) const {
    struct stat found;
    return lstat(path.c_str(), &found) == 0;
}

/// The way to this build and its sources is on every fake host: no test put it there.
static bool leadsToTheTests(const fs::path& directory) {
    const std::string start = directory.string() + "/";
    return buildDirectory().starts_with(start) || testsDirectory().starts_with(start);
}

std::vector<std::string> FakeHost::listDirectory(const std::string& path) const {
    std::vector<std::string> names;
    std::error_code none;
    for (const auto& entry : fs::directory_iterator(path, none))
        if (!leadsToTheTests(entry.path())) names.push_back(entry.path().filename());
    std::sort(names.begin(), names.end());
    return names;
}

void FakeHost::readOnly(const std::string& path) {
    Tree tree(path);
    tree.makeReadOnly();
    tree.attach(path);
}

// An overlay, because a small full file system would give the pages of a truncated file back to whoever
// rewrites it.
void FakeHost::fullDisk(const std::string& path) {
    const std::string disk = "/.full/" + std::to_string(ballast_.size());
    makeDirectories(disk);
    must(mount("full", disk.c_str(), "tmpfs", MS_NOSUID | MS_NODEV, "size=64k"), "mount a small disk");
    makeDirectories(disk + "/upper");
    makeDirectories(disk + "/work");
    std::string layers = "lowerdir=" + path + ",upperdir=" + disk + "/upper,workdir=" + disk + "/work";
    mountOver(path, [&] {
        if (mount("full", path.c_str(), "overlay", 0, (layers + ",userxattr").c_str()) != 0)
            must(mount("full", path.c_str(), "overlay", 0, layers.c_str()), "mount the full disk at " + path);
    });
    ballast_.push_back(fillDisk(disk));
}

void FakeHost::mountOver(const std::string& path, const std::function<void()>& mounting) {
    std::vector<std::pair<std::string, Tree>> kept;
    for (const std::string& place : {buildDirectory(), testsDirectory()})
        if (place.starts_with(path + "/")) kept.emplace_back(place, Tree(place));
    mounting();
    for (auto& [place, tree] : kept) {
        makeDirectories(place);
        tree.attach(place);
    }
}

void FakeHost::restore(const std::string& path) {
    must(umount2(path.c_str(), MNT_DETACH), "end the mount at " + path);
}

void FakeHost::copyTree(const std::string& recordedHost) {
    fs::path source = recordedHost;
    if (source.is_relative()) source = fs::path(testsDirectory()) / "hosts" / source;
    constexpr auto how =
        fs::copy_options::recursive | fs::copy_options::copy_symlinks | fs::copy_options::overwrite_existing;
    for (const auto& entry : fs::directory_iterator(source))
        if (!installsSpecially(entry.path().filename())) fs::copy(entry, "/" / entry.path().filename(), how);
    if (auto name = readFile(source / "hostname")) setHostName(name->substr(0, name->find('\n')));
    if (!fs::exists(source / "tools")) return;
    fs::copy(source / "tools", answerDirectory, how);
    for (const auto& entry : fs::directory_iterator(source / "tools"))
        installTool(textOfFileName(entry.path().filename()));
}

void FakeHost::setHostName(const std::string& name) {
    must(sethostname(name.data(), name.size()), "set the host name");
}

void FakeHost::useKernelNetwork() {
    Tree("/.sys").attach("/sys");
    remove("/proc/net");
    symlink("/proc/net", "/.proc/net");
    bringLoopbackUp();
}

Finished FakeHost::run(const std::vector<std::string>& words, std::chrono::seconds limit) {
    return start(words).wait(limit);
}

RunningProgram FakeHost::start(const std::vector<std::string>& words) {
    keepProcessNumbersLow();
    return RunningProgram(words, "/record/program" + std::to_string(++programs_));
}
