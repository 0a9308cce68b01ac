#include "plugins/hardware/network/neighbours.h"

#include <memory>

#include "plugins/hardware/library_function.h"

namespace hardware {

namespace {

// The library's header comes in a package that also installs and starts lldpd, which nobody wants on the
// machine that he builds on. So what is used of the library's binary interface, its fourth, stands here.
struct Connection;
struct Atom;
struct Iterator;

enum Key : int {
    kInterfaceName = 1000,
    kPortNeighbours = 1200,
    kPortId = 1204,
    kPortDescription = 1205,
    kPortChassis = 1208,
    kChassisId = 1802,
    kChassisName = 1803,
};

struct Client {
    Connection* (*connect)(void* send, void* receive, void* user) = nullptr;
    int (*release)(Connection*) = nullptr;
    Atom* (*interfaces)(Connection*) = nullptr;
    Atom* (*port)(Atom* interface) = nullptr;
    Atom* (*get)(Atom*, int key) = nullptr;
    const char* (*text)(Atom*, int key) = nullptr;
    Iterator* (*first)(Atom*) = nullptr;
    Iterator* (*next)(Atom*, Iterator*) = nullptr;
    Atom* (*value)(Atom*, Iterator*) = nullptr;
    void (*drop)(Atom*) = nullptr;
    void (*logTo)(void (*log)(int severity, const char* message)) = nullptr;
    bool whole = false;
};

Client loadClient() {
    Client client;
    void* const library = dlopen("liblldpctl.so.4", RTLD_NOW | RTLD_LOCAL);
    client.whole = findFunction(library, "lldpctl_new", client.connect) &&
                   findFunction(library, "lldpctl_release", client.release) &&
                   findFunction(library, "lldpctl_get_interfaces", client.interfaces) &&
                   findFunction(library, "lldpctl_get_port", client.port) &&
                   findFunction(library, "lldpctl_atom_get", client.get) &&
                   findFunction(library, "lldpctl_atom_get_str", client.text) &&
                   findFunction(library, "lldpctl_atom_iter", client.first) &&
                   findFunction(library, "lldpctl_atom_iter_next", client.next) &&
                   findFunction(library, "lldpctl_atom_iter_value", client.value) &&
                   findFunction(library, "lldpctl_atom_dec_ref", client.drop) &&
                   findFunction(library, "lldpctl_log_callback", client.logTo);
    if (client.whole) {  // it would write to standard error that no lldpd runs
        client.logTo([](int /*severity*/, const char* /*message*/) {});
    }
    return client;
}

using OwnAtom = std::unique_ptr<Atom, void (*)(Atom*)>;

template <class Take>
void forEach(const Client& client, const OwnAtom& list, const Take& take) {
    for (Iterator* at = list ? client.first(list.get()) : nullptr; at != nullptr;
         at = client.next(list.get(), at)) {
        if (const OwnAtom item(client.value(list.get(), at), client.drop); item) {
            take(item.get());
        }
    }
}

std::string textOf(const Client& client, Atom* atom, Key key) {
    const char* const text = atom == nullptr ? nullptr : client.text(atom, key);
    return text == nullptr ? "" : text;
}

Neighbour neighbourAt(const Client& client, Atom* port) {
    const OwnAtom chassis(client.get(port, kPortChassis), client.drop);
    return {textOf(client, chassis.get(), kChassisName), textOf(client, chassis.get(), kChassisId),
            textOf(client, port, kPortId), textOf(client, port, kPortDescription)};
}

}  // namespace

Neighbours askNeighbours() {
    static const Client client = loadClient();
    Neighbours all;
    if (!client.whole) {
        return all;
    }
    const std::unique_ptr<Connection, int (*)(Connection*)> connection(
        client.connect(nullptr, nullptr, nullptr), client.release);
    const OwnAtom links(connection ? client.interfaces(connection.get()) : nullptr, client.drop);
    forEach(client, links, [&](Atom* link) {
        const OwnAtom port(client.port(link), client.drop);
        const OwnAtom neighbours(port ? client.get(port.get(), kPortNeighbours) : nullptr, client.drop);
        forEach(client, neighbours, [&](Atom* neighbour) {
            all[textOf(client, link, kInterfaceName)].push_back(neighbourAt(client, neighbour));
        });
    });
    return all;
}

}  // namespace hardware
