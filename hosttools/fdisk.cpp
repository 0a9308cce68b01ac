#include <algorithm>
#include <cstdlib>
#include <memory>
#include <string>
#include <vector>

#include "hosttools/applet.h"
#include "hosttools/fdisk_listing.h"

namespace hosttools {
namespace {

constexpr const char* toolName = "fdisk";

struct Request {
    bool list = false;
    std::vector<std::string> devices;
};

/// l lists; s and u beside it ask for what is printed anyway.
bool readOptions(std::string_view letters, Request& request) {
    if (letters.empty() || letters.find_first_not_of("lsu") != std::string_view::npos) return false;
    request.list = request.list || letters.find('l') != std::string_view::npos;
    return true;
}

bool readRequest(Arguments arguments, Request& request) {
    for (const std::string_view argument : arguments) {
        if (!argument.starts_with('-')) {
            request.devices.emplace_back(argument);
        } else if (!readOptions(argument.substr(1), request)) {
            return false;
        }
    }
    return request.list;
}

/// The path behind links such as /dev/disk/by-id/..., or the path itself.
std::string resolved(const std::string& path) {
    const std::unique_ptr<char, void (*)(void*)> real(realpath(path.c_str(), nullptr), free);
    return real ? real.get() : path;
}

/// Puts the disks that were asked for in the place of all, in the order they were asked for.
bool select(const std::vector<std::string>& devices, std::vector<Disk>& disks, Answer& answer) {
    std::vector<Disk> chosen;
    bool found = true;
    for (const std::string& device : devices) {
        const auto match =
            std::ranges::find(disks, resolved(device), [](const Disk& disk) { return "/dev/" + disk.name; });
        if (match != disks.end()) {
            chosen.push_back(*match);
        } else {
            answer.complain(toolName, Text().add(device).add(" is not a disk of this host"));
            found = false;
        }
    }
    disks = std::move(chosen);
    return found;
}

/// The messages go to standard error: a consumer takes every line of the listing that
/// begins with "Disk" and a disk of this host's for a disk of its own.
void print(const std::vector<Disk>& disks, Answer& answer) {
    for (const Disk& disk : disks) {
        listDisk(answer.out, disk);
        if (isBare(disk)) answer.errors.add(missingTableMessage(disk));
    }
}

}  // namespace

int runFdisk(Arguments arguments, Host& host, Answer& answer) {
    Request request;
    if (!readRequest(arguments, request)) {
        return answer.leaveToHost(toolName, firstOf(arguments));
    }
    auto disks = host.disks();
    if (!disks) return 1;
    const bool found = request.devices.empty() || select(request.devices, *disks, answer);
    print(*disks, answer);
    return found ? 0 : 1;
}

}  // namespace hosttools
