#include "tests/support/shell_stub.h"

#include <dlfcn.h>

#include <memory>
#include <mutex>
#include <set>
#include <utility>

#include "agent/shell/runner.h"

namespace {

struct Rules {
    std::function<bool(const std::string&)> fails;
    std::function<std::optional<std::string>(const std::string&)> answers;
    std::function<void(const std::string&)> look;
};

Rules& rules() {
    static Rules only;
    return only;
}

/// The streams that stand for a command which was never run.
struct Canned {
    std::mutex guard;
    std::set<FILE*> streams;
};

Canned& canned() {
    static Canned only;
    return only;
}

FILE* openCanned(const std::string& output) {
    std::unique_ptr<FILE, int (*)(FILE*)> stream(tmpfile(), fclose);
    if (stream != nullptr) {
        fwrite(output.data(), 1, output.size(), stream.get());
        rewind(stream.get());
        const std::lock_guard lock(canned().guard);
        canned().streams.insert(stream.get());
    }
    return stream.release();
}

bool takeCanned(FILE* stream) {
    const std::lock_guard lock(canned().guard);
    return canned().streams.erase(stream) != 0;
}

}  // namespace

namespace shell_stub {

void failWhen(std::function<bool(const std::string&)> rule) {
    rules().fails = std::move(rule);
}

void answerWith(std::function<std::optional<std::string>(const std::string&)> rule) {
    rules().answers = std::move(rule);
}

void beforeEach(std::function<void(const std::string&)> look) {
    rules().look = std::move(look);
}

FILE* open(const char* command, const char* mode, FILE* (*shell)(const char*, const char*)) {
    if (rules().look) {
        rules().look(command);
    }
    if (rules().fails && rules().fails(command)) {
        return nullptr;
    }
    const auto output = rules().answers ? rules().answers(command) : std::nullopt;
    return output ? openCanned(*output) : shell(command, mode);
}

}  // namespace shell_stub

// Stands in front of the C library's for the code in this program.
extern "C" __attribute__((visibility("default"))) int pclose(FILE* stream) {
    if (takeCanned(stream)) {
        return fclose(stream);
    }
    if (const auto status = cvagent::shell::closeCommand(stream)) {
        return *status;
    }
    using Pclose = int (*)(FILE*);
    static const auto next = reinterpret_cast<Pclose>(dlsym(RTLD_NEXT, "pclose"));
    return next(stream);
}
