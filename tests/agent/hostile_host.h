#pragma once

#include <algorithm>
#include <string>
#include <vector>

#include "tests/agent/suse_host.h"
#include "tests/support/waiting.h"

/// A tool that never ends; its shell is not the process that waits.
inline ToolAnswer hanging() {
    return {.out = "", .action = "sleep 1000"};
}

/// The words with which cvagent runs without the right to mount anything, as in many containers: its /tmp is
/// the host's.
inline std::vector<std::string> withoutMounts(FakeHost& host, const std::vector<std::string>& words) {
    host.realTool("setpriv");
    std::vector<std::string> line = {"setpriv", "--bounding-set=-sys_admin"};
    line.insert(line.end(), words.begin(), words.end());
    return line;
}

/// From here on the tool does its worst, but for as many calls as a start makes it does as before.
inline void afterTheStart(FakeHost& host, const SuseHost& suse, const std::string& command,
                          const ToolAnswer& good, const ToolAnswer& worst) {
    host.tool(command, good);
    host.clearCalls();
    host.run(suse.commandLine({"tree"}));
    const auto calls = host.calls();
    std::vector<ToolAnswer> answers(static_cast<std::size_t>(std::count(calls.begin(), calls.end(), command)),
                                    good);
    answers.push_back(worst);
    host.toolInTurn(command, answers);
}

/// Whether a process still runs whose command line begins so.
inline bool isRunning(const FakeHost& host, const std::string& program) {
    for (int process = 1; process <= 256; ++process) {
        if (host.read("/proc/" + std::to_string(process) + "/cmdline").value_or("").starts_with(program)) {
            return true;
        }
    }
    return false;
}

/// Whether none runs any more: one that was killed takes a moment to be gone.
inline bool isGone(const FakeHost& host, const std::string& program) {
    return eventually([&] { return !isRunning(host, program); });
}
