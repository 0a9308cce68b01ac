#include <unistd.h>

#include <filesystem>
#include <sstream>
#include <stdexcept>

#include "tests/support/fake_host.h"
#include "tests/support/files.h"
#include "tests/support/system_call.h"
#include "tests/support/tool_files.h"

namespace fs = std::filesystem;
using namespace fake_host;

namespace {

std::vector<std::string> splitWords(const std::string& command) {
    std::vector<std::string> words;
    bool quoted = false;
    bool open = false;  // a word has begun
    for (size_t at = 0; at < command.size(); ++at) {
        char c = command[at];
        if (!quoted && c == ' ') {
            open = false;
            continue;
        }
        if (!open) words.emplace_back();
        open = true;
        if (c == '\'')
            quoted = !quoted;
        else if (c == '\\' && !quoted && command.substr(at, 2) == "\\'")
            words.back() += command[++at];
        else
            words.back() += c;
    }
    if (quoted || words.empty()) throw std::invalid_argument("no tool command: " + command);
    return words;
}

std::vector<std::string> linesOf(const char* path) {
    std::istringstream text(readFile(path).value_or(""));
    std::vector<std::string> lines;
    for (std::string line; std::getline(text, line);) lines.push_back(line);
    return lines;
}

std::string answerPath(const std::string& command, unsigned turn) {
    std::vector<std::string> words = splitWords(command);
    std::vector<std::string> arguments(words.begin() + 1, words.end());
    std::string name = arguments == std::vector<std::string>{"%any"} ? "%any" : answerName(arguments);
    if (turn > 1) name += "%" + std::to_string(turn);
    return std::string(answerDirectory) + "/" + fileName(words.front()) + "/" + name;
}

std::string linkOf(const std::string& tool) {
    return tool.find('/') == std::string::npos ? std::string(toolDirectory) + "/" + tool : tool;
}

}  // namespace

void FakeHost::installTool(const std::string& name) {
    std::string place = linkOf(name);
    makeParents(place);
    unlink(place.c_str());
    symlink(place, std::string(toolProgramDirectory) + "/fake_tool");
}

void FakeHost::answer(const std::string& command, const ToolAnswer& answer, unsigned turn) {
    const std::string path = answerPath(command, turn);
    auto extra = [&](const char* kind, const std::string& text, bool wanted) {
        if (wanted)
            writeFile(path + kind, text);
        else
            unlink((path + kind).c_str());
    };
    writeFile(path, answer.out);
    extra("%status", std::to_string(answer.status), answer.status != 0);
    extra("%err", answer.err, !answer.err.empty());
    extra("%delay", std::to_string(answer.delayMilliseconds), answer.delayMilliseconds != 0);
    extra("%action", answer.action, !answer.action.empty());
}

void FakeHost::tool(const std::string& command, const std::string& out, int status) {
    tool(command, ToolAnswer{out, status, "", 0, ""});
}

void FakeHost::tool(const std::string& command, const ToolAnswer& answer) {
    toolInTurn(command, {answer});
}

void FakeHost::toolInTurn(const std::string& command, const std::vector<ToolAnswer>& answers) {
    unsigned turn = 0;
    for (const ToolAnswer& next : answers) answer(command, next, ++turn);
    while (exists(answerPath(command, ++turn))) unlink(answerPath(command, turn).c_str());
    std::string name = splitWords(command).front();
    unlink((std::string(turnsDirectory) + "/" + fileName(name) + " " +
            fs::path(answerPath(command, 1)).filename().string())
               .c_str());
    installTool(name);
}

void FakeHost::toolMissing(const std::string& name) {
    unlink(linkOf(name).c_str());
    if (name.find('/') != std::string::npos) return;
    for (const char* directory : {"/usr/bin/", "/usr/sbin/"}) unlink((directory + name).c_str());
}

void FakeHost::recordOnly(const std::string& name) {
    tool(name + " %any", "");
}

void FakeHost::realTool(const std::string& name) {
    for (const char* directory : {"/.bin/", "/.sbin/"}) {
        if (!exists(directory + name)) continue;
        toolMissing(name);
        symlink("/usr/bin/" + name, directory + name);
        return;
    }
    throw std::invalid_argument("this machine has no " + name);
}

void FakeHost::expectUnrecorded() {
    unrecordedExpected_ = true;
}

std::vector<std::string> FakeHost::unrecorded() const {
    return linesOf(failuresFile);
}

std::vector<std::string> FakeHost::calls() const {
    return linesOf(callsFile);
}

std::vector<std::string> FakeHost::callsOf(const std::string& name) const {
    std::vector<std::string> found;
    for (const std::string& call : calls())
        if (splitWords(call).front() == name) found.push_back(call);
    return found;
}

void FakeHost::clearCalls() {
    unlink(callsFile);
}

std::vector<ClockCall> FakeHost::clockCalls() const {
    std::vector<ClockCall> found;
    for (const std::string& line : linesOf(clockFile)) {
        ClockCall call{};
        std::istringstream(line) >> call.function >> call.seconds >> call.microseconds >> call.timeZone;
        found.push_back(call);
    }
    return found;
}

void FakeHost::clockFails(int error) {
    if (error == 0)
        unlink(clockErrorFile);
    else
        writeFile(clockErrorFile, std::to_string(error));
}
