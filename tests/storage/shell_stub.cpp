#include "tests/storage/shell_stub.h"

#include <dlfcn.h>

#include <cstdio>
#include <mutex>
#include <set>
#include <thread>

#include "mi/globals.h"

namespace {

std::function<bool(const std::string&)> fails;
std::function<std::optional<std::string>(const std::string&)> answers;
std::function<void(const std::string&)> look;
bool keep = true;

std::mutex guard;  // guards what stands below
std::vector<std::string> started;
std::set<FILE*> canned;

template <class Function>
Function systems(const char* name) {
    return reinterpret_cast<Function>(dlsym(RTLD_NEXT, name));
}

FILE* openCanned(const std::string& output) {
    FILE* stream = tmpfile();
    if (stream != nullptr) {
        fwrite(output.data(), 1, output.size(), stream);
        rewind(stream);
        const std::lock_guard lock(guard);
        canned.insert(stream);
    }
    return stream;
}

bool takeCanned(FILE* stream) {
    const std::lock_guard lock(guard);
    return canned.erase(stream) != 0;
}

}  // namespace

// The plug-in's code, which is linked into this program, finds these before the C library's.
extern "C" FILE* popen(const char* command, const char* mode) {
    const std::string text(command);
    if (keep) {
        const std::lock_guard lock(guard);
        started.push_back(text);
    }
    if (look) {
        look(text);
    }
    if (fails && fails(text)) {
        return nullptr;
    }
    if (answers) {
        if (const auto output = answers(text)) {
            return openCanned(*output);
        }
    }
    static const auto real = systems<FILE* (*)(const char*, const char*)>("popen");
    return real(command, mode);
}

extern "C" int pclose(FILE* stream) {
    if (takeCanned(stream)) {
        return fclose(stream);
    }
    static const auto real = systems<int (*)(FILE*)>("pclose");
    return real(stream);
}

namespace shell_stub {

void failWhen(std::function<bool(const std::string&)> rule) {
    fails = std::move(rule);
}

void answerWith(std::function<std::optional<std::string>(const std::string&)> rule) {
    answers = std::move(rule);
}

void beforeEach(std::function<void(const std::string&)> what) {
    look = std::move(what);
}

std::vector<std::string> commands() {
    const std::lock_guard lock(guard);
    return started;
}

void clearCommands() {
    const std::lock_guard lock(guard);
    started.clear();
}

void keepCommands(bool wanted) {
    keep = wanted;
}

bool fileLockIsHeld() {
    bool taken = false;
    // A thread of its own: nobody may try a lock that he may be holding.
    std::thread([&taken] {
        taken = IC::OSHWMI::myfileLock.lock(0);
        if (taken) {
            IC::OSHWMI::myfileLock.unlock();
        }
    }).join();
    return !taken;
}

}  // namespace shell_stub
