#include <cstring>

#include "hosttools/applet.h"
#include "hosttools/text.h"

namespace hosttools {
namespace {

constexpr const char* programName = "corvista-hosttools";

constexpr Applet applets[] = {
    {"fdisk", runFdisk, "fdisk -l[su] [DISK]..."},
    {"ifconfig", runIfconfig,
     "ifconfig [-a] [INTERFACE [up|down|ADDRESS|netmask MASK|broadcast ADDRESS|pointopoint ADDRESS]...]"},
    {"route", runRoute,
     "route [-A inet6] -n\n"
     "  route add|del -host A|-net A netmask M|default [gw G] [metric N] [[dev] INTERFACE]"},
};

const Applet* findApplet(std::string_view name) {
    for (const Applet& applet : applets) {
        if (name == applet.name) return &applet;
    }
    return nullptr;
}

std::string_view baseName(std::string_view path) {
    return path.substr(path.rfind('/') + 1);
}

int printHelp() {
    Text text;
    text.add(programName).add(" prints the classic formats of host tools whose own output has changed.\n\n");
    text.add("Usage: ").add(programName).add(" TOOL [ARGUMENT]...\n");
    text.add("   or: TOOL [ARGUMENT]...   (through a link with the tool's name)\n\nTools:\n");
    for (const Applet& applet : applets) text.add("  ").add(applet.usage).add("\n");
    text.add("\nOptions:\n  --help     print this text\n  --version  print the version\n");
    return finish(text);
}

int printVersion() {
    return finish(Text().add(programName).add(" " CORVISTA_VERSION "\n"));
}

int runNamed(Arguments words) {
    if (words.empty()) {
        complain(programName, "which tool? Try --help");
        return 1;
    }
    const std::string_view name = words.front();
    if (name == "--help") return printHelp();
    if (name == "--version") return printVersion();
    if (const Applet* applet = findApplet(name)) return applet->run(words.subspan(1));
    complain(programName, Text().add("no such tool: ").add(name).add(". Try --help"));
    return 1;
}

}  // namespace

int runProgram(Arguments words) {
    if (words.empty()) return 1;
    if (const Applet* applet = findApplet(baseName(words.front()))) return applet->run(words.subspan(1));
    return runNamed(words.subspan(1));
}

}  // namespace hosttools

int main(int count, char** words) {
    return hosttools::runProgram({words, static_cast<std::size_t>(count)});
}
