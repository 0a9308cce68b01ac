#pragma once

#include <span>
#include <vector>

namespace hardware {

/// The classes of nodes, by the type number they have in the tree. The numbers are one list for all plug-ins.
enum class Class : unsigned int {
    hardware = 300,  ///< the plug-in's own node, the root of the others
    system = 301,
    memory = 302,
    memoryModule = 303,
    processor = 304,
    drive = 305,
    partition = 306,
    fileSystem = 307,
    array = 308,    ///< md
    mapping = 309,  ///< device-mapper
    link = 310,
    sensor = 311,
};

/// Property ids are unique over all classes: those of class 305 are 30501 to 30599, and 30500 holds the name
/// of a node where there can be several.
using Id = unsigned int;

struct ClassRow {
    Class type;
    const char* name;  ///< as in paths
    bool several;      ///< the name of the node stands behind the class
    /// Names of properties, a blank between, that tell its nodes apart at a glance.
    const char* telling = "";
};

constexpr Id firstId(Class type) {
    return static_cast<unsigned int>(type) * 100;
}
constexpr Class classOfId(Id id) {
    return static_cast<Class>(id / 100);
}

enum class Kind { text, texts, number, flag };

struct Traits {
    bool live = false;     ///< it changes while nobody announces it, so a read asks the host anew
    bool trusted = false;  ///< of use to a thief or a tracker: told to root and to those the service names
};
constexpr Traits kLive{.live = true};
constexpr Traits kTrusted{.trusted = true};

/// One row of the catalogue.
struct Row {
    Id id;  ///< its class is in it
    const char* name;
    Kind kind;
    const char* unit;    ///< "" for none
    const char* source;  ///< the file, or the call, that it comes from
    const char* meaning;
    Traits traits{};
};

/// The rows that a source brings along.
using Rows = std::span<const Row>;

std::span<const ClassRow> classes();
const ClassRow& classRow(Class type);
/// The rows of all sources, in the order in which people see them.
std::vector<Row> allRows();

}  // namespace hardware
