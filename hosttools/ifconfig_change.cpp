#include "hosttools/ifconfig_change.h"

#include <net/if.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <algorithm>
#include <cerrno>
#include <cstring>

#include "hosttools/addresses.h"
#include "hosttools/files.h"
#include "hosttools/text.h"

namespace hosttools {
namespace {

constexpr const char* toolName = "ifconfig";

/// The classic calls on one interface.
class Change {
public:
    Change(const char* interface, Answer& answer)
        : socket_(socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0)), interface_(interface), answer_(answer) {}

    bool flags(unsigned set, unsigned clear) {
        ifreq request = emptyRequest();
        if (!call(SIOCGIFFLAGS, "SIOCGIFFLAGS", request)) return false;
        const unsigned flags = static_cast<unsigned short>(request.ifr_flags);
        request.ifr_flags = static_cast<short>((flags | set) & ~clear);
        return call(SIOCSIFFLAGS, "SIOCSIFFLAGS", request);
    }
    bool address(unsigned long number, const char* name, in_addr value) {
        ifreq request = emptyRequest();
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_addr = value;
        std::memcpy(&request.ifr_addr, &address, sizeof address);
        return call(number, name, request);
    }
    void complain(std::string_view message) { answer_.complain(toolName, message); }

private:
    ifreq emptyRequest() const {
        ifreq request{};
        interface_.copy(request.ifr_name, IFNAMSIZ - 1);
        return request;
    }
    bool call(unsigned long number, const char* name, ifreq& request) {
        if (ioctl(socket_.get(), number, &request) == 0) return true;
        complain(Text().add(name).add(": ").add(std::strerror(errno)));
        return false;
    }

    Descriptor socket_;
    std::string_view interface_;
    Answer& answer_;
};

struct FlagWord {
    std::string_view word;
    unsigned set;
    unsigned clear;
};

constexpr FlagWord flagWords[] = {
    {"up", IFF_UP | IFF_RUNNING, 0},
    {"down", 0, IFF_UP},
};

struct AddressWord {
    std::string_view word;
    unsigned long number;
    const char* name;
};

constexpr AddressWord addressWords[] = {
    {"netmask", SIOCSIFNETMASK, "SIOCSIFNETMASK"},
    {"broadcast", SIOCSIFBRDADDR, "SIOCSIFBRDADDR"},
    {"pointopoint", SIOCSIFDSTADDR, "SIOCSIFDSTADDR"},
    {"dstaddr", SIOCSIFDSTADDR, "SIOCSIFDSTADDR"},
};

bool readAddress(Change& change, const char* word, in_addr& address) {
    if (parseInet(word, address)) return true;
    change.complain(Text().add("bad address '").add(word).add("'"));
    return false;
}

bool setAddress(Change& change, unsigned long number, const char* name, const char* word) {
    in_addr address{};
    return readAddress(change, word, address) && change.address(number, name, address);
}

/// Carries out the first word, with its argument when it has one.
/// @param words what is left; what was carried out is taken off
bool changeNext(Change& change, Arguments& words) {
    const char* word = words.front();
    words = words.subspan(1);
    if (const auto* flag = std::ranges::find(flagWords, word, &FlagWord::word); flag != std::end(flagWords)) {
        return change.flags(flag->set, flag->clear);
    }
    const auto* address = std::ranges::find(addressWords, word, &AddressWord::word);
    if (address == std::end(addressWords)) {
        return setAddress(change, SIOCSIFADDR, "SIOCSIFADDR", word) && change.flags(IFF_UP | IFF_RUNNING, 0);
    }
    if (words.empty()) {
        change.complain(Text().add(word).add(" needs an address"));
        return false;
    }
    const char* value = words.front();
    words = words.subspan(1);
    return setAddress(change, address->number, address->name, value);
}

}  // namespace

int changeInterface(const char* interface, Arguments words, Answer& answer) {
    Change change(interface, answer);
    while (!words.empty()) {
        if (!changeNext(change, words)) return 1;
    }
    return 0;
}

}  // namespace hosttools
