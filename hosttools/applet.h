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
    /// Asked for what is not done here, and nothing has been done: it is for the host's own tool. What is
    /// among the errors is said where there is none.
    bool beyond = false;

    /// "<tool>: <message>" among the errors.
    void complain(std::string_view tool, std::string_view message);
    /// Leaves the whole call to the host's own tool, for a word that means nothing here.
    /// @return the exit status where there is none
    int leaveToHost(std::string_view tool, std::string_view word);
};

/// One tool. None of them ends the program or prints by itself.
struct Applet {
    const char* name;
    /// @return the exit status
    int (*run)(Arguments, Host&, Answer&);
    const char* usage;
};

/// The first of the words; "" when there is none.
std::string_view firstOf(Arguments words);

/// All of them.
std::span<const Applet> applets();
/// @return null when there is none of that name
const Applet* findApplet(std::string_view name);

/// `brctl show`: the bridges and their members.
int runBrctl(Arguments arguments, Host& host, Answer& answer);
/// `egrep 'eth|bond|usb' /proc/net/dev`: the wired interfaces, whatever they are called.
int runEgrep(Arguments arguments, Host& host, Answer& answer);
/// `ethtool INTERFACE`: speed, duplex, link modes, Wake-on-LAN and link of an interface.
int runEthtool(Arguments arguments, Host& host, Answer& answer);
/// `fdisk -l [DISK...]`: the disks and their partitions.
int runFdisk(Arguments arguments, Host& host, Answer& answer);
/// `ifconfig [-a] [INTERFACE [CHANGE...]]`: the interfaces that are up (-a: all), one, or a change of one.
int runIfconfig(Arguments arguments, Host& host, Answer& answer);
/// `route [-A inet6] -n`: the routing tables; `route add|del ...`: a change of an IPv4 route.
int runRoute(Arguments arguments, Host& host, Answer& answer);

}  // namespace hosttools
