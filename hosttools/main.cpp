#include <unistd.h>

#include "hosttools/applet.h"
#include "hosttools/host_tool.h"
#include "hosttools/text.h"

namespace hosttools {
namespace {

constexpr const char* programName = "corvista-hosttools";

std::string_view baseName(std::string_view path) {
    return path.substr(path.rfind('/') + 1);
}

/// The whole output goes out at once.
int print(const Answer& answer, int status) {
    const bool whole = writeAll(STDOUT_FILENO, answer.out);
    writeAll(STDERR_FILENO, answer.errors);
    return whole ? status : 1;
}

int complain(std::string_view message) {
    Answer answer;
    answer.complain(programName, message);
    return print(answer, 1);
}

int run(const Applet& applet, Arguments words) {
    Host host;
    Answer answer;
    const int status = applet.run(words, host, answer);
    if (answer.beyond) becomeHostTool(applet.name, words);
    return print(answer, status);
}

int printHelp() {
    Answer answer;
    Text& text = answer.out;
    text.add(programName).add(" stands in for host tools that are missing or whose output has changed.\n");
    text.add("What it is asked for besides goes to the host's own tool where there is one.\n\n");
    text.add("Usage: ").add(programName).add(" TOOL [ARGUMENT]...\n");
    text.add("   or: TOOL [ARGUMENT]...   (through a link with the tool's name)\n\nTools:\n");
    for (const Applet& applet : applets()) text.add("  ").add(applet.usage).add("\n");
    text.add("\nOptions:\n  --help     print this text\n  --version  print the version\n");
    return print(answer, 0);
}

int printVersion() {
    Answer answer;
    answer.out.add(programName).add(" " CORVISTA_VERSION "\n");
    return print(answer, 0);
}

int runNamed(Arguments words) {
    if (words.empty()) return complain("which tool? Try --help");
    const std::string_view name = words.front();
    if (name == "--help") return printHelp();
    if (name == "--version") return printVersion();
    if (const Applet* applet = findApplet(name)) return run(*applet, words.subspan(1));
    return complain(Text().add("no such tool: ").add(name).add(". Try --help"));
}

}  // namespace

int runProgram(Arguments words) {
    if (words.empty()) return 1;
    if (const Applet* applet = findApplet(baseName(words.front()))) return run(*applet, words.subspan(1));
    return runNamed(words.subspan(1));
}

}  // namespace hosttools

int main(int count, char** words) {
    return hosttools::runProgram({words, static_cast<std::size_t>(count)});
}
