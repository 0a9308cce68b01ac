#include <fcntl.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <climits>
#include <cstdlib>
#include <string>
#include <utility>
#include <vector>

#include "tests/support/fake_host.h"
#include "tests/support/files.h"
#include "tests/support/mounts.h"
#include "tests/support/system_call.h"
#include "tests/support/tool_files.h"
#include "tests/support/world.h"

namespace fake_host {
namespace {

// Tools that only work on the text and the files they are given.
constexpr const char* plainTools[] = {
    "[",       "awk",     "basename",  "bash",     "cat",      "chmod",  "cksum", "cmp",   "cp",
    "cut",     "dash",    "dd",        "diff",     "dirname",  "echo",   "egrep", "env",   "expr",
    "false",   "fgrep",   "find",      "gawk",     "grep",     "head",   "id",    "kill",  "ln",
    "ls",      "mawk",    "md5sum",    "mkdir",    "mkfifo",   "mktemp", "mv",    "nproc", "od",
    "printf",  "ps",      "pwd",       "readlink", "realpath", "rm",     "rmdir", "sed",   "seq",
    "sh",      "sha1sum", "sha256sum", "sleep",    "sort",     "stat",   "tail",  "tee",   "test",
    "timeout", "touch",   "tr",        "true",     "uname",    "uniq",   "wc",    "xargs", "yes"};

// What the kernel shows of processes and itself; everything else in /proc belongs to the test.
constexpr const char* realProc[] = {"self",   "thread-self", "mounts",      "meminfo", "stat",
                                    "uptime", "loadavg",     "filesystems", "sys",     "version"};

constexpr const char* devices[] = {"null", "zero", "full", "random", "urandom", "tty"};

constexpr const char* ownDirectories[] = {"etc",         "proc/net", "sys",   "var",     "opt",
                                          "root",        "run",      "tools", "dev/shm", ".cover/bin",
                                          ".cover/sbin", ".bin",     ".sbin", ".proc",   ".sys"};

struct Mount {
    Tree tree;
    std::string place;  // relative to the new root
};

std::string linkTarget(const std::string& path) {
    char target[PATH_MAX];
    ssize_t size = readlink(path.c_str(), target, sizeof target);
    return size < 0 ? "" : std::string(target, static_cast<size_t>(size));
}

// /usr/bin/awk may lead through /etc/alternatives, which a fake host does not have.
const std::vector<std::pair<std::string, std::string>>& plainToolLinks() {
    static const auto links = [] {
        std::vector<std::pair<std::string, std::string>> found;
        for (std::string name : plainTools) {
            char real[PATH_MAX];
            if (!realpath(("/usr/bin/" + name).c_str(), real)) continue;
            std::string path = real;
            if (path.rfind("/usr/bin/", 0) == 0) path = "/.bin/" + path.substr(9);
            found.emplace_back(".cover/bin/" + name, path);
        }
        return found;
    }();
    return links;
}

void link(const std::string& place, const std::string& target) {
    must(symlink(target.c_str(), place.c_str()), "link " + place);
}

// Copies of the machine's trees, taken before anything is mounted over them.
std::vector<Mount> machineTrees() {
    std::vector<Mount> mounts;
    auto take = [&](const std::string& path, const std::string& place, bool writable = false) {
        mounts.push_back({Tree(path), place});
        if (!writable) mounts.back().tree.makeReadOnly();
    };
    take("/usr", "usr");
    take("/usr/bin", ".bin");
    take("/usr/sbin", ".sbin");
    for (std::string name : {"lib", "lib32", "lib64", "libx32"})
        if (struct stat found; lstat(("/" + name).c_str(), &found) == 0 && S_ISDIR(found.st_mode))
            take("/" + name, name);
    if (access("/etc/ld.so.cache", R_OK) == 0) take("/etc/ld.so.cache", "etc/ld.so.cache");
    for (std::string name : devices) take("/dev/" + name, "dev/" + name, true);
    take(testsDirectory(), testsDirectory().substr(1));
    const char* writable = std::getenv("CORVISTA_TEST_WRITABLE_BUILD");
    take(buildDirectory(), buildDirectory().substr(1), writable && *writable == '1');
    take(buildDirectory() + "/fakehost", std::string(toolProgramDirectory).substr(1));
    return mounts;
}

void makePlaces(const std::vector<Mount>& mounts) {
    for (std::string name : ownDirectories) makeDirectories(name);
    makeDirectories("tmp");
    must(chmod("tmp", 01777), "open /tmp to everybody");
    must(chmod("root", 0700), "close /root");
    for (const Mount& mount : mounts) {
        if (mount.tree.isDirectory())
            makeDirectories(mount.place);
        else
            writeFile(mount.place, "");
    }
}

void linkMachine() {
    link("bin", "usr/bin");
    link("sbin", "usr/sbin");
    for (std::string name : {"lib", "lib32", "lib64", "libx32"})
        if (std::string target = linkTarget("/" + name); !target.empty()) link(name, target);
    link("dev/fd", "/proc/self/fd");
    link("dev/stdin", "/proc/self/fd/0");
    link("dev/stdout", "/proc/self/fd/1");
    link("dev/stderr", "/proc/self/fd/2");
    for (const auto& [place, target] : plainToolLinks()) link(place, target);
}

void linkProc() {
    for (std::string name : realProc) link("proc/" + name, "/.proc/" + name);
    for (int process = 1; process <= highestProcess; ++process) {
        std::string name = std::to_string(process);
        link("proc/" + name, "/.proc/" + name);
    }
}

// The kernel's files belong to the machine's root, who is the one running this when the tests run as root.
void mountKernel() {
    const unsigned long plain = MS_NOSUID | MS_NODEV | MS_NOEXEC;
    must(mount("proc", ".proc", "proc", plain, nullptr), "mount the process file system");
    must(mount("sysfs", ".sys", "sysfs", plain | MS_RDONLY, nullptr), "mount sysfs");
    Tree network(".proc/sys/net");
    for (std::string name : {".proc/sys", ".proc/sysrq-trigger", ".proc/irq", ".proc/bus", ".proc/fs"}) {
        if (access(name.c_str(), F_OK) != 0) continue;
        Tree tree(name);
        tree.makeReadOnly();
        tree.attach(name);
    }
    network.attach(".proc/sys/net");  // its own network's settings, safe to change
}

}  // namespace

void prepareRoot() {
    plainToolLinks();
}

void buildRoot() {
    must(mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr), "make the mounts private");
    std::vector<Mount> mounts = machineTrees();
    must(mount("fakehost", "/tmp", "tmpfs", MS_NOSUID | MS_NODEV, "mode=0755,size=512m"),
         "mount the new root");
    must(chdir("/tmp"), "enter the new root");
    umask(022);
    makePlaces(mounts);
    linkMachine();
    linkProc();
    for (Mount& mount : mounts) mount.tree.attach(mount.place);
    Tree(".cover/bin").attach("usr/bin");
    Tree(".cover/sbin").attach("usr/sbin");
    mountKernel();
    must(syscall(SYS_pivot_root, ".", "."), "change the root");
    must(umount2(".", MNT_DETACH), "let go of the machine's root");
    must(chdir("/"), "enter the root");
}

}  // namespace fake_host
