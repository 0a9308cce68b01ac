// A client library of lldpd that knows two links without asking anybody. It counts what it has handed out.
#include <atomic>
#include <cstring>

namespace {

constexpr const char* kLinks[] = {"eth0", "eth1"};

struct Neighbour {
    const char* name;
    const char* chassis;
    const char* port;
    const char* description;
};

// The second one says little, and that badly.
constexpr Neighbour kHeard[] = {{"switch-1.example", "00:11:22:33:44:55", "ge-0/0/7", "to the rack"},
                                {"evil\x1b[2J\n\xff", "a", nullptr, nullptr}};

std::atomic<int> handedOut = 0;

}  // namespace

struct lldpctl_conn_t {};
struct lldpctl_atom_t {
    enum Kind { links, link, port, heard, neighbour, chassis } kind;
    std::size_t place;
};
struct lldpctl_atom_iter_t {};

namespace {

lldpctl_atom_t* handOut(lldpctl_atom_t::Kind kind, std::size_t place) {
    ++handedOut;
    return new lldpctl_atom_t{kind, place};
}

std::size_t countOf(const lldpctl_atom_t* list) {
    return list->kind == lldpctl_atom_t::links ? std::size(kLinks) : list->place == 0 ? std::size(kHeard) : 0;
}

// An iterator is its place and one, so that none is null.
lldpctl_atom_iter_t* at(std::size_t place, std::size_t count) {
    return place < count ? reinterpret_cast<lldpctl_atom_iter_t*>(place + 1) : nullptr;
}

std::size_t placeOf(lldpctl_atom_iter_t* iterator) {
    return reinterpret_cast<std::size_t>(iterator) - 1;
}

}  // namespace

#pragma GCC visibility push(default)
extern "C" {

int fake_lldpctl_handed_out() {
    return handedOut;
}

lldpctl_conn_t* lldpctl_new(void* /*send*/, void* /*receive*/, void* /*user*/) {
    ++handedOut;
    return new lldpctl_conn_t;
}

int lldpctl_release(lldpctl_conn_t* connection) {
    --handedOut;
    delete connection;
    return 0;
}

void lldpctl_log_callback(void (* /*log*/)(int, const char*)) {}

lldpctl_atom_t* lldpctl_get_interfaces(lldpctl_conn_t* /*connection*/) {
    return handOut(lldpctl_atom_t::links, 0);
}

lldpctl_atom_t* lldpctl_get_port(lldpctl_atom_t* link) {
    return handOut(lldpctl_atom_t::port, link->place);
}

lldpctl_atom_t* lldpctl_atom_get(lldpctl_atom_t* atom, int key) {
    if (atom->kind == lldpctl_atom_t::port && key == 1200) {
        return handOut(lldpctl_atom_t::heard, atom->place);
    }
    return atom->kind == lldpctl_atom_t::neighbour && key == 1208
               ? handOut(lldpctl_atom_t::chassis, atom->place)
               : nullptr;
}

const char* lldpctl_atom_get_str(lldpctl_atom_t* atom, int key) {
    const bool chassis = atom->kind == lldpctl_atom_t::chassis;
    if (atom->kind == lldpctl_atom_t::link && key == 1000) {
        return kLinks[atom->place];
    }
    if (chassis || atom->kind == lldpctl_atom_t::neighbour) {
        const Neighbour& heard = kHeard[atom->place];
        switch (key) {
            case 1803:
                return chassis ? heard.name : nullptr;
            case 1802:
                return chassis ? heard.chassis : nullptr;
            case 1204:
                return chassis ? nullptr : heard.port;
            case 1205:
                return chassis ? nullptr : heard.description;
            default:
                break;
        }
    }
    return nullptr;
}

lldpctl_atom_iter_t* lldpctl_atom_iter(lldpctl_atom_t* list) {
    return at(0, countOf(list));
}

lldpctl_atom_iter_t* lldpctl_atom_iter_next(lldpctl_atom_t* list, lldpctl_atom_iter_t* iterator) {
    return at(placeOf(iterator) + 1, countOf(list));
}

lldpctl_atom_t* lldpctl_atom_iter_value(lldpctl_atom_t* list, lldpctl_atom_iter_t* iterator) {
    return handOut(list->kind == lldpctl_atom_t::links ? lldpctl_atom_t::link : lldpctl_atom_t::neighbour,
                   placeOf(iterator));
}

void lldpctl_atom_dec_ref(lldpctl_atom_t* atom) {
    --handedOut;
    delete atom;
}
}
#pragma GCC visibility pop
