// What a start costs against the bare commands it runs, on real links in a network of its own.
//   build/bench/bench/walk_bench [LINKS...]      1 10 100 when none is named
// One line a size: links, commands, seconds of initialize, seconds of the same commands run by popen alone,
// the ratio.
#include <fcntl.h>
#include <unistd.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <sstream>
#include <string>
#include <vector>

#include "oshwmi/os_hw_mi.h"
#include "tests/support/command_lines.h"
#include "tests/support/fake_host.h"

namespace {

using Clock = std::chrono::steady_clock;

double seconds(Clock::time_point start) {
    return std::chrono::duration<double>(Clock::now() - start).count();
}

/// Links named eth0, eth1, … with an address each.
void wire(FakeHost& host, int links) {
    std::ostringstream batch;
    for (int i = 0; i < links; ++i) {
        batch << "link add eth" << i << " type veth peer name p" << i << "\nlink set eth" << i
              << " up\nlink set p" << i << " up\naddress add 10." << i / 250 << '.' << i % 250
              << ".1/24 dev eth" << i << '\n';
    }
    host.file("/tmp/links", batch.str());
    host.run({"sh", "-c", "ip -batch /tmp/links; rm /tmp/links"}, std::chrono::seconds(300));
}

void useRealTools(FakeHost& host) {
    for (const char* tool : {"ip", "ethtool", "brctl", "hostname"}) {
        host.realTool(tool);
    }
    host.useKernelNetwork();
    host.directory("/opt/vantrel/corvista/data");
    // The adapters stand where an agent would put them: first on the path.
    std::string path;
    for (const char* tool : {"fdisk", "ifconfig", "route"}) {
        path += buildDirectory() + "/hosttools/adapters/" + tool + ":";
    }
    const char* hosts = std::getenv("PATH");
    path += hosts != nullptr ? hosts : "/usr/sbin:/usr/bin:/sbin:/bin";
    setenv("PATH", path.c_str(), 1);
}

double runBare(const std::vector<std::string>& commands) {
    const auto start = Clock::now();
    for (const std::string& command : commands) {
        FILE* pipe = popen(command.c_str(), "r");
        while (pipe != nullptr && std::fgetc(pipe) != EOF) {
        }
        if (pipe != nullptr) {
            pclose(pipe);
        }
    }
    return seconds(start);
}

/// As under an agent: many of the commands name a file that is not there, and their `cat` says so.
void silenceCommands() {
    const int nowhere = open("/dev/null", O_WRONLY | O_CLOEXEC);
    if (nowhere >= 0) {
        dup2(nowhere, STDERR_FILENO);
        close(nowhere);
    }
}

void measure(FakeHost& host, int links) {
    useRealTools(host);
    wire(host, links);
    silenceCommands();
    const CommandLines recorded;
    const auto start = Clock::now();
    IC::myoshwmi.initialize(1, IC::Number(1U), IC::Number(2U));
    const double whole = seconds(start);
    const std::vector<std::string> commands = recorded.all();
    IC::myoshwmi.unload();
    const double bare = runBare(commands);
    std::printf("%5d %8zu %10.2f %10.2f %8.3f\n", links, commands.size(), whole, bare, whole / bare);
    static_cast<void>(std::fflush(stdout));
}

}  // namespace

int main(int argc, char** argv) {
    std::vector<int> sizes;
    for (int i = 1; i < argc; ++i) {
        sizes.push_back(static_cast<int>(std::strtol(argv[i], nullptr, 10)));
    }
    if (sizes.empty()) {
        sizes = {1, 10, 100};
    }
    std::printf("links commands initialize       bare    ratio\n");
    for (const int links : sizes) {
        inFakeHost([links](FakeHost& host) { measure(host, links); }, std::chrono::seconds(900));
    }
    return 0;
}
