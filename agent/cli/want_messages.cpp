#include "agent/cli/want_messages.h"

#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdlib>
#include <exception>
#include <new>
#include <string_view>

#include "agent/cli/failure.h"
#include "agent/cli/print.h"
#include "agent/core/want.h"

namespace cvagent {

namespace {

struct Remedy {
    int error;
    const char* text;
};

constexpr std::array<Remedy, 4> kRemedies = {
    {{EMFILE, "Raise the limit: ulimit -n 256"},
     {ENFILE, "Raise its limit: sysctl fs.file-max"},
     {EAGAIN,
      "Raise the limits of processes and memory: ulimit -u, ulimit -v, or TasksMax= and MemoryMax= of the "
      "service"},
     {ENOMEM, "Raise the limit of memory: ulimit -v, or MemoryMax= of the service"}}};

std::string remedyFor(int error) {
    const auto row = std::ranges::find(kRemedies, error, &Remedy::error);
    return row == kRemedies.end() ? "" : std::string("\n") + row->text;
}

std::string gapsIn(const std::vector<NodeRef>& tree, bool processors) {
    std::string names;
    for (const std::string& name : missingClasses(tree, processors)) {
        names += (names.empty() ? "" : ", ") + name;
    }
    return names.empty() ? "some of the tree can be missing: "
                         : "the tree has no " + names + ", and more can be missing: ";
}

}  // namespace

bool WantMessages::tell(const std::vector<NodeRef>* tree, bool processors) {
    const Want want = findWant();
    if (want.error == 0 || want.error == told_) {
        return told_ != 0;
    }
    told_ = want.error;
    std::string text = tree != nullptr ? gapsIn(*tree, processors) : "";
    if (want.commands != 0) {
        text += std::to_string(want.commands) + (want.commands == 1 ? " command" : " commands") +
                " could not be started, ";
    }
    complain(text + want.cause + remedyFor(want.error));
    return true;
}

void failPlainlyWithoutMemory() {
    static const std::terminate_handler other = std::set_terminate([] {
        try {
            if (std::current_exception() != nullptr) {
                throw;
            }
        } catch (const std::bad_alloc&) {
        } catch (...) {
            other();
        }
        constexpr std::string_view kText = "cvagent: the system gives no more memory\n";
        [[maybe_unused]] const ssize_t written = write(STDERR_FILENO, kText.data(), kText.size());
        std::_Exit(static_cast<int>(ExitStatus::failed));
    });
}

}  // namespace cvagent
