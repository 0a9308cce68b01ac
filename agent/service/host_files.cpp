#include "agent/service/host_files.h"

#include <sys/stat.h>
#include <sys/utsname.h>

#include <filesystem>
#include <utility>

namespace cvagent::service {

namespace {

/// Files, and directories with those in them.
constexpr const char* kPlaces[] = {"/etc/hosts",      "/etc/resolv.conf", "/etc/localtime",
                                   "/etc/HOSTNAME",   "/etc/hostname",    "/etc/nsswitch.conf",
                                   "/var/lib/dhcpcd", "/var/lib/dhcpv6"};

/// What is another one when a file was written or replaced; "" for none.
std::string dateOf(const std::string& path) {
    struct stat file {};
    if (stat(path.c_str(), &file) != 0) {
        return "";
    }
    std::string date;
    for (const auto number :
         {static_cast<long long>(file.st_ino), static_cast<long long>(file.st_size),
          static_cast<long long>(file.st_mtim.tv_sec), static_cast<long long>(file.st_mtim.tv_nsec)}) {
        date += std::to_string(number) + " ";
    }
    return date;
}

std::string datesBelow(const std::string& path) {
    constexpr int kMost = 4096;  // a directory of something else
    std::string dates = dateOf(path) + "\n";
    std::error_code none;
    int left = kMost;
    for (std::filesystem::directory_iterator file(path, none), end; file != end && left > 0; --left) {
        dates += file->path().string() + " " + dateOf(file->path()) + "\n";
        file.increment(none);
    }
    return dates;
}

}  // namespace

bool HostFiles::haveChanged() {
    utsname host{};
    uname(&host);
    std::string now = std::string(host.nodename) + "\n";
    for (const char* place : kPlaces) {
        now += datesBelow(place);
    }
    const std::string before = std::exchange(last_, std::move(now));
    return !before.empty() && before != last_;
}

}  // namespace cvagent::service
