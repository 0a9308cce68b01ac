// Every scripted tool of a fake host is a link to this program. It records its call, looks its answer up by
// name and exact arguments and gives it. One small static program, because a test of many interfaces calls it
// hundreds of times.
#include <fcntl.h>
#include <sys/file.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <ctime>
#include <string>
#include <vector>

#include "tests/support/tool_files.h"

namespace {

using namespace fake_host;

// One write, so that the lines of a pipeline's tools never mix.
void appendLine(const char* path, std::string line) {
    for (size_t at = 0; (at = line.find('\n', at)) != std::string::npos;) line.replace(at, 1, "\\n");
    line += '\n';
    int file = open(path, O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0644);
    if (file < 0 || write(file, line.data(), line.size()) < 0) _exit(unrecordedStatus);
    close(file);
}

bool readText(const std::string& path, std::string& text) {
    int file = open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (file < 0) return false;
    char block[16384];
    text.clear();
    for (ssize_t got; (got = read(file, block, sizeof block)) > 0;)
        text.append(block, static_cast<size_t>(got));
    close(file);
    return true;
}

void print(int descriptor, const std::string& text) {
    for (size_t done = 0; done < text.size();) {
        ssize_t put = write(descriptor, text.data() + done, text.size() - done);
        if (put <= 0) return;
        done += static_cast<size_t>(put);
    }
}

int readNumber(const std::string& path) {
    std::string text;
    return readText(path, text) ? std::atoi(text.c_str()) : 0;
}

std::string calledName(const std::string& word) {
    std::string ours = std::string(toolDirectory) + "/";
    return word.compare(0, ours.size(), ours) == 0 ? word.substr(ours.size()) : word;
}

// Counts the calls with these arguments under a lock: tools of one pipeline run side by side.
int countCall(const std::string& key) {
    int file = open((std::string(turnsDirectory) + "/" + key).c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0644);
    if (file < 0) return 1;
    flock(file, LOCK_EX);
    char digits[16] = {};
    ssize_t got = pread(file, digits, sizeof digits - 1, 0);
    int turn = (got > 0 ? std::atoi(digits) : 0) + 1;
    std::string text = std::to_string(turn);
    ssize_t put = pwrite(file, text.data(), text.size(), 0);
    close(file);
    return put > 0 ? turn : 1;
}

// "eth0" is the first answer, "eth0%2" the second...; the last one stays.
std::string answerOfThisTurn(const std::string& path, const std::string& key) {
    auto answerOf = [&](int turn) { return turn == 1 ? path : path + "%" + std::to_string(turn); };
    if (access(answerOf(2).c_str(), F_OK) != 0) return path;
    int turn = countCall(key);
    while (turn > 1 && access(answerOf(turn).c_str(), F_OK) != 0) --turn;
    return answerOf(turn);
}

void pause(int milliseconds) {
    if (milliseconds <= 0) return;
    timespec left{milliseconds / 1000, (milliseconds % 1000) * 1000000L};
    while (nanosleep(&left, &left) != 0) {
    }
}

void act(const std::string& script, char** arguments) {
    if (access(script.c_str(), F_OK) != 0) return;
    std::vector<char*> words{const_cast<char*>("sh"), const_cast<char*>(script.c_str())};
    for (; *arguments; ++arguments) words.push_back(*arguments);
    words.push_back(nullptr);
    pid_t child = fork();
    if (child == 0) {
        execv("/bin/sh", words.data());
        _exit(127);
    }
    int status;
    if (child > 0) waitpid(child, &status, 0);
}

[[noreturn]] void failUnrecorded(const std::string& line) {
    appendLine(failuresFile, line);
    print(STDERR_FILENO, "fake host: no answer is recorded for: " + line + "\n");
    _exit(unrecordedStatus);
}

}  // namespace

int main(int argc, char** argv) {
    std::string name = calledName(argv[0]);
    std::vector<std::string> arguments(argv + 1, argv + argc);
    std::string line = quoteWord(name) + (arguments.empty() ? "" : " ") + joinWords(arguments);
    appendLine(callsFile, line);

    std::string directory = std::string(answerDirectory) + "/" + fileName(name) + "/";
    std::string file = answerName(arguments);
    if (access((directory + file).c_str(), F_OK) != 0) file = "%any";
    std::string answer = answerOfThisTurn(directory + file, fileName(name) + " " + file);
    std::string out;
    if (!readText(answer, out)) failUnrecorded(line);
    pause(readNumber(answer + "%delay"));
    act(answer + "%action", argv + 1);
    std::string err;
    if (readText(answer + "%err", err)) print(STDERR_FILENO, err);
    print(STDOUT_FILENO, out);
    return readNumber(answer + "%status");
}
