#include "hosttools/ifconfig_change.h"

#include <net/if.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <algorithm>
#include <cerrno>
#include <cstring>
#include <vector>

#include "hosttools/addresses.h"
#include "hosttools/descriptor.h"
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

private:
    ifreq emptyRequest() const {
        ifreq request{};
        interface_.copy(request.ifr_name, IFNAMSIZ - 1);
        return request;
    }
    bool call(unsigned long number, const char* name, ifreq& request) {
        if (ioctl(socket_.get(), number, &request) == 0) return true;
        answer_.complain(toolName, Text().add(name).add(": ").add(std::strerror(errno)));
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

/// An address that stands alone. It also brings the interface up.
constexpr AddressWord ownAddress = {"an address", SIOCSIFADDR, "SIOCSIFADDR"};

/// One thing to be done: flags, or an address.
struct Step {
    const FlagWord* flags = nullptr;
    const AddressWord* kind = nullptr;
    in_addr address{};
};

template <typename Known>
const Known* findWord(std::span<const Known> known, std::string_view word) {
    const auto found = std::ranges::find(known, word, &Known::word);
    return found != known.end() ? &*found : nullptr;
}

/// Reads all words before the first of them is carried out: of a call that is not understood nothing is done.
class Reader {
public:
    Reader(Arguments words, Answer& answer) : words_(words), answer_(answer) {}

    /// @return whether all of it can be done here
    bool read(std::vector<Step>& steps) {
        while (!words_.empty()) {
            Step step;
            if (!readNext(step) || !isNew(step, steps)) return false;
            steps.push_back(step);
        }
        return true;
    }

private:
    bool readNext(Step& step) {
        const char* const word = take();
        step.flags = findWord<FlagWord>(flagWords, word);
        if (step.flags != nullptr) return true;
        step.kind = findWord<AddressWord>(addressWords, word);
        if (step.kind == nullptr) {
            step.kind = &ownAddress;
            return parseInet(word, step.address) || leaveToHost(word);
        }
        if (words_.empty()) return refuse(Text().add(word).add(" needs an address"));
        const char* const value = take();
        return parseInet(value, step.address) || leaveToHost(value);
    }
    bool isNew(const Step& step, const std::vector<Step>& steps) {
        const bool again = step.kind != nullptr && std::ranges::any_of(steps, [&](const Step& before) {
                               return before.kind != nullptr && before.kind->number == step.kind->number;
                           });
        return !again || refuse(Text().add(step.kind->word).add(" is given twice"));
    }
    const char* take() {
        const char* const word = words_.front();
        words_ = words_.subspan(1);
        return word;
    }
    /// Names of hosts, and words such as mtu, hw or 10.0.0.1/24. The empty word is nobody's.
    bool leaveToHost(std::string_view word) {
        if (word.empty()) return refuse("an empty word is no address");
        answer_.leaveToHost(toolName, word);
        return false;
    }
    bool refuse(std::string_view message) {
        answer_.complain(toolName, message);
        return false;
    }

    Arguments words_;
    Answer& answer_;
};

bool carryOut(Change& change, const Step& step) {
    if (step.flags != nullptr) return change.flags(step.flags->set, step.flags->clear);
    return change.address(step.kind->number, step.kind->name, step.address) &&
           (step.kind != &ownAddress || change.flags(IFF_UP | IFF_RUNNING, 0));
}

}  // namespace

int changeInterface(const char* interface, Arguments words, Answer& answer) {
    std::vector<Step> steps;
    if (!Reader(words, answer).read(steps)) return 1;
    // The calls would take the beginning of a longer name for the whole.
    if (*interface == '\0' || std::string_view(interface).size() >= IFNAMSIZ) {
        answer.complain(toolName, Text().add(interface).add(": ").add(std::strerror(ENODEV)));
        return 1;
    }
    Change change(interface, answer);
    return std::ranges::all_of(steps, [&](const Step& step) { return carryOut(change, step); }) ? 0 : 1;
}

}  // namespace hosttools
