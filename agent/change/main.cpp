// corvista-rehearsal: has a plug-in make changes where nothing of the host can be reached. It is asked in one
// line of JSON on standard input and answers in JSON on standard output, both one socket; when the other end
// of that is closed it ends, and all that it has started.
#include <fcntl.h>
#include <poll.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <exception>

#include "agent/change/attempt.h"
#include "agent/change/cannot.h"
#include "agent/change/name_keeper.h"
#include "agent/change/name_service.h"
#include "agent/change/namespaces.h"
#include "agent/change/record.h"
#include "agent/change/recorders.h"
#include "agent/change/request_json.h"
#include "agent/core/data_directory.h"
#include "agent/core/program_path.h"
#include "agent/core/surroundings.h"
#include "agent/keep/manager.h"
#include "hosttools/text.h"

namespace {

using cvagent::change::Cannot;
using cvagent::change::Fence;
using cvagent::change::must;
using cvagent::change::Record;
using hosttools::Descriptor;

constexpr std::size_t kMostRequest = 16U << 20U;
constexpr const char* kOwnData = "/run/corvista-rehearsal";

/// Two ways between the process inside and the one outside, who names its users.
struct Turns {
    Turns() {
        std::array<int, 2> asking{};
        std::array<int, 2> done{};
        must(pipe2(asking.data(), O_CLOEXEC), "no pipe");
        must(pipe2(done.data(), O_CLOEXEC), "no pipe");
        asked = Descriptor(asking[0]);
        ask = Descriptor(asking[1]);
        granted = Descriptor(done[0]);
        grant = Descriptor(done[1]);
    }
    /// Each side keeps its own ends, so that it hears when the other one has gone.
    void keepInside() {
        asked.reset();
        grant.reset();
    }
    void keepOutside() {
        ask.reset();
        granted.reset();
    }
    Descriptor asked, ask, granted, grant;
};

bool passTurn(const Descriptor& pipe) {
    return write(pipe.get(), "", 1) == 1;
}

bool takeTurn(const Descriptor& pipe) {
    char turn = 0;
    ssize_t got = -1;
    while ((got = read(pipe.get(), &turn, 1)) < 0 && errno == EINTR) {
    }
    return got == 1;
}

std::string readRequest(int socket) {
    std::string text;
    std::array<char, 65536> part{};
    while (!text.ends_with('\n') && text.size() < kMostRequest) {
        const ssize_t got = read(socket, part.data(), part.size());
        if (got == 0 || (got < 0 && errno != EINTR)) {
            break;
        }
        text.append(part.data(), static_cast<std::size_t>(got > 0 ? got : 0));
    }
    return text;
}

/// The answer's way is nothing for the plug-in's commands.
Descriptor takeSocket() {
    Descriptor socket(fcntl(STDOUT_FILENO, F_DUPFD_CLOEXEC, STDERR_FILENO + 1));
    const Descriptor nowhere(open("/dev/null", O_RDWR | O_CLOEXEC));
    for (const int standard : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
        must(dup2(nowhere.get(), standard), "no standard streams");
    }
    return socket;
}

/// Where the agent keeps its data, without a slash at its end; "": at the place that is always covered.
std::string dataDirectory(const cvagent::change::RehearsalRequest& request) {
    const char* chosen = std::getenv(cvagent::kDataVariable);
    std::string directory = !request.dataDirectory.empty() ? request.dataDirectory
                            : chosen != nullptr            ? chosen
                            : geteuid() != 0               ? cvagent::userDirectory()
                                                           : "";
    while (directory.size() > 1 && directory.ends_with('/')) {
        directory.pop_back();
    }
    return directory;
}

/// A user who has no agent's data yet gets a place for them.
void nameData(const std::string& directory, bool asUser) {
    const bool isThere = !directory.empty() && access(directory.c_str(), F_OK) == 0;
    if (asUser && !isThere) {
        setenv(cvagent::kDataVariable, kOwnData, 1);
    } else if (!directory.empty()) {
        setenv(cvagent::kDataVariable, directory.c_str(), 1);
    }
}

std::string tryChanges(const cvagent::change::RehearsalRequest& request, cvagent::change::Isolation isolation,
                       Turns& turns) {
    must(unshare(CLONE_NEWNS), "no mounts of its own");
    must(mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr), "no mounts of its own");
    isolation.covers = cvagent::change::isolateFiles(isolation.asUser, isolation.dataDirectory);
    cvagent::change::askNoNameServer();
    isolation.fence = cvagent::change::enterFence(isolation.asUser, [&turns] {
        if (!passTurn(turns.ask) || !takeTurn(turns.granted)) {
            throw Cannot("the users of a namespace cannot be named");
        }
    });
    turns.ask.reset();  // it may not have been needed
    isolation.network = cvagent::change::copyNetwork();
    if (isolation.fence == Fence::droppedRights) {  // whose right to the network is one to the host's as well
        cvagent::change::enterNetwork(isolation.network);
        cvagent::change::startNameKeeper();
    }
    cvagent::change::limitRights(isolation.fence);
    nameData(isolation.dataDirectory, isolation.asUser);
    return answerOf(cvagent::change::attempt(request, isolation));
}

/// Ends without the plug-in's own end, which has nothing to put in order here.
int runInside(const Descriptor& socket, const cvagent::change::RehearsalRequest& request,
              cvagent::change::Isolation isolation, Turns& turns) {
    std::string answer;
    try {
        answer = tryChanges(request, std::move(isolation), turns);
    } catch (const std::exception& problem) {
        answer = cvagent::change::answerOf(std::string(problem.what()));
    }
    return hosttools::writeAll(socket.get(), answer) ? EXIT_SUCCESS : EXIT_FAILURE;
}

/// Until the process inside has ended, or nobody waits for it any more.
void watch(pid_t process, const Descriptor& socket) {
    const Descriptor handle(static_cast<int>(syscall(SYS_pidfd_open, process, 0)));
    std::array<pollfd, 2> awaited{pollfd{handle.get(), POLLIN, 0}, pollfd{socket.get(), POLLRDHUP, 0}};
    while (poll(awaited.data(), awaited.size(), -1) < 0 && errno == EINTR) {
    }
    kill(process, SIGKILL);
    while (waitpid(process, nullptr, 0) < 0 && errno == EINTR) {
    }
}

/// Whether one of the changes can be of something that NetworkManager keeps.
bool isOfInterface(const cvagent::change::RehearsalRequest& request) {
    return std::ranges::any_of(request.changes, [](const cvagent::change::Change& change) {
        return change.node.find("ip-config") != std::string::npos;
    });
}

void rehearse(const Descriptor& socket, const std::string& text) {
    const auto request = cvagent::change::requestFromJson(text);
    cvagent::change::Isolation isolation;
    isolation.dataDirectory = dataDirectory(request);
    if (isOfInterface(request)) {
        cvagent::keep::loseManager([](const std::string& asked) { Record::only().command(asked, true); });
    }
    cvagent::programDirectory();  // is found now: below another root it cannot be told later
    isolation.asUser = cvagent::change::gainRightToIsolate();
    Turns turns;
    const pid_t process = cvagent::change::startFirstProcess([&] {
        turns.keepInside();
        return runInside(socket, request, std::move(isolation), turns);
    });
    turns.keepOutside();
    if (takeTurn(turns.asked)) {
        cvagent::change::mapUsersOf(process);
        passTurn(turns.grant);
    }
    watch(process, socket);
}

}  // namespace

int main(int count, char** words) {
    if (const auto status = cvagent::change::runAsRecorder(count, words)) {
        return *status;
    }
    cvagent::openStandardDescriptors();
    close_range(STDERR_FILENO + 1, ~0U, 0);  // what the caller has open is the host's
    const std::string request = readRequest(STDIN_FILENO);
    Descriptor socket;
    int status = EXIT_SUCCESS;
    try {
        socket = takeSocket();
        rehearse(socket, request);
    } catch (const std::exception& problem) {
        hosttools::writeAll(socket.get(), cvagent::change::answerOf(std::string(problem.what())));
        status = EXIT_FAILURE;
    }
    _exit(status);  // what is done at an end may need a thread, and the table that it would stand in is gone
}
