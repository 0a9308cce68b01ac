#pragma once

#include <memory>
#include <optional>
#include <span>
#include <string_view>
#include <vector>

#include "hosttools/disks.h"
#include "hosttools/interfaces.h"
#include "hosttools/text.h"

namespace hosttools {

/// The words after the tool's name.
using Arguments = std::span<const char* const>;

/// What a tool reads of the host. A program that asks often keeps what has not changed.
class Host {
public:
    Host() = default;
    Host(const Host&) = delete;
    Host& operator=(const Host&) = delete;
    virtual ~Host() = default;

    /// Links and addresses, of all links or of the one named; more than were asked for do no harm.
    /// @return 0 or an error number, ENODEV when the one link is not there
    virtual int interfaces(std::string_view only, std::shared_ptr<const Interfaces>& found);
    /// @return nothing when they cannot be told here
    virtual std::optional<std::vector<Disk>> disks();
};

/// What a tool prints.
struct Answer {
    Text out;
    Text errors;

    /// "<tool>: <message>" among the errors.
    void complain(std::string_view tool, std::string_view message);
};

/// One tool. None of them ends the program or prints by itself.
struct Applet {
    const char* name;
    /// @return the exit status
    int (*run)(Arguments, Host&, Answer&);
    const char* usage;
};

/// All of them.
std::span<const Applet> applets();
/// @return null when there is none of that name
const Applet* findApplet(std::string_view name);

/// `fdisk -l [DISK...]`: the disks and their partitions.
int runFdisk(Arguments arguments, Host& host, Answer& answer);
/// `ifconfig [-a] [INTERFACE [CHANGE...]]`: the interfaces that are up (-a: all), one, or a change of one.
int runIfconfig(Arguments arguments, Host& host, Answer& answer);
/// `route [-A inet6] -n`: the routing tables; `route add|del ...`: a change of an IPv4 route.
int runRoute(Arguments arguments, Host& host, Answer& answer);

}  // namespace hosttools
