#include "agent/undo/saved_state.h"

#include <linux/rtnetlink.h>
#include <sys/utsname.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <thread>
#include <utility>

#include "agent/undo/boot_clock.h"
#include "agent/undo/file_restore.h"
#include "agent/undo/route_makers.h"

namespace cvagent::undo {

namespace {

constexpr std::uint64_t kVersion = 1;
constexpr std::size_t kLongestHostName = 64;  // the kernel's own bound of a host name

/// The lists of a network under their names in a text.
struct List {
    const char* name;
    std::vector<NetworkMessage> NetworkMessages::*part;  ///< null: the neighbours
};
constexpr List kLists[] = {{"link", &NetworkMessages::links},       {"address", &NetworkMessages::addresses},
                           {"nexthop", &NetworkMessages::nextHops}, {"route", &NetworkMessages::routes},
                           {"rule", &NetworkMessages::rules},       {"neighbour", nullptr}};

/// @param state a NetworkState, constant or not
template <class State>
auto& listOf(State& state, const List& list) {
    return list.part != nullptr ? state.network.*list.part : state.neighbours;
}

struct CallList {
    std::string_view name;
    std::vector<std::string> KeeperCalls::*list;
};
constexpr CallList kCallLists[] = {{"keeper-file", &KeeperCalls::files},
                                   {"keeper-before", &KeeperCalls::before},
                                   {"keeper-after", &KeeperCalls::after}};

void takeRecord(const Record& record, SavedState& state) {
    const auto* list =
        std::ranges::find_if(kLists, [&](const List& each) { return record.name == each.name; });
    if (list != std::end(kLists)) {
        listOf(state.network, *list).push_back({0, std::string(record.bytes)});
    } else if (const auto* calls = std::ranges::find(kCallLists, record.name, &CallList::name);
               calls != std::end(kCallLists)) {
        (state.calls.*calls->list).emplace_back(record.bytes);
    } else if (record.name == "file") {
        state.files.push_back(fileStateFrom(record.bytes));
    } else if (record.name == "host") {
        state.hostName = record.bytes;
    } else if (record.name == "domain") {
        state.domainName = record.bytes;
    } else if (record.name == "boot") {
        state.boot = record.bytes;
    } else if (record.name == "milliseconds") {
        state.milliseconds = record.number();
    } else if (record.name == "without-network") {
        state.hasNetwork = false;
    } else if (record.name == "problem") {
        state.network.network.problem = static_cast<int>(record.number(INT16_MAX));
    } else {
        throw BadRecord("a saved state has a part that is not known");
    }
}

/// The old value where the change has touched it and nobody else since.
bool isToPutBack(const std::string& before, const std::string* left, const std::string& now) {
    return before != now && (left == nullptr || (*left != before && *left == now));
}

void noteProblem(const char* what, int result, std::vector<std::string>& notes) {
    if (result != 0) {
        notes.push_back(std::string(what) + " is not put back: " + std::strerror(errno));
    }
}

void putBackHostName(const SavedState& before, std::vector<std::string>& notes) {
    noteProblem("the host name", sethostname(before.hostName.data(), before.hostName.size()), notes);
}

/// The first process has taken its name from the file before anything could be put back. To be called before
/// the file comes back, so that who was killed in between finds it to do.
void putBackNameOfStart(const SavedState& before, const std::vector<std::size_t>& indices,
                        const SavedState& began, std::vector<std::string>& notes) {
    const bool isNamed = std::ranges::any_of(indices, [&before](std::size_t i) {
        return before.files[i].path == "/etc/hostname" || before.files[i].path == "/etc/HOSTNAME";
    });
    if (isNamed && before.hostName != began.hostName) {
        putBackHostName(before, notes);
    }
}

void putBackNames(const SavedState& before, const SavedState* left, const SavedState& began,
                  std::vector<std::string>& notes) {
    if (isToPutBack(before.hostName, left != nullptr ? &left->hostName : nullptr, began.hostName)) {
        putBackHostName(before, notes);
    }
    if (isToPutBack(before.domainName, left != nullptr ? &left->domainName : nullptr, began.domainName)) {
        noteProblem("the domain name", setdomainname(before.domainName.data(), before.domainName.size()),
                    notes);
    }
}

/// Whoever was told of his old files may be the one who has changed another one since: he makes it of them
/// again, behind his answer.
void noteOthersFiles(const SavedState& before, std::vector<std::size_t> others, bool isKeeperTold,
                     std::vector<std::string>& notes) {
    constexpr std::uint64_t kLongest = 5000;
    constexpr std::chrono::milliseconds kBetweenFileLooks{20};
    const auto isBack = [&before](std::size_t i) {
        return fileStateOf(before.files[i].path).isAs(before.files[i]);
    };
    const std::uint64_t end = bootMilliseconds() + kLongest;
    std::erase_if(others, isBack);
    while (isKeeperTold && !others.empty() && bootMilliseconds() < end) {
        std::this_thread::sleep_for(kBetweenFileLooks);
        std::erase_if(others, isBack);
    }
    for (const std::size_t i : others) {
        notes.push_back(before.files[i].path + " has been changed by somebody else since and stays as it is");
    }
}

}  // namespace

SavedState SavedState::of(const std::vector<std::string>& paths, bool hasNetwork) {
    SavedState state;
    state.hasNetwork = hasNetwork;
    for (const std::string& path : paths) {
        state.files.push_back(fileStateOf(path));
    }
    if (hasNetwork) {
        state.network = NetworkState::read();
        std::erase_if(state.network.network.routes, isOfRoutingProgram);
    }
    utsname names{};
    if (uname(&names) == 0) {
        state.hostName = static_cast<const char*>(names.nodename);
        state.domainName = static_cast<const char*>(names.domainname);
    }
    state.boot = bootId();
    state.milliseconds = bootMilliseconds();
    return state;
}

std::vector<std::string> SavedState::paths() const {
    std::vector<std::string> all;
    std::ranges::transform(files, std::back_inserter(all), &FileState::path);
    return all;
}

SavedState SavedState::again() const {
    return of(paths(), hasNetwork);
}

bool SavedState::isAs(const SavedState& other) const {
    const auto isSameFile = [](const FileState& one, const FileState& two) {
        return one.path == two.path && one.isAs(two);
    };
    return std::ranges::equal(files, other.files, isSameFile) && hostName == other.hostName &&
           domainName == other.domainName && isSameNetwork(network, other.network);
}

std::string SavedState::obstacle() const {
    for (const FileState& file : files) {
        if (file.type == FileState::Type::other) {
            return file.path + ": " + file.content;
        }
    }
    const int problem = network.network.problem;
    return problem == 0 ? "" : std::string("the network cannot be read: ") + std::strerror(problem);
}

std::string textOf(const SavedState& state) {
    RecordWriter text;
    text.add("corvista-saved", kVersion).add("boot", state.boot).add("milliseconds", state.milliseconds);
    text.add("host", state.hostName).add("domain", state.domainName);
    for (const FileState& file : state.files) {
        text.add("file", recordOf(file));
    }
    for (const CallList& list : kCallLists) {
        for (const std::string& each : state.calls.*list.list) {
            text.add(list.name, each);
        }
    }
    if (!state.hasNetwork) {
        text.add("without-network", "");
    }
    text.add("problem", static_cast<std::uint64_t>(state.network.network.problem));
    for (const List& list : kLists) {
        for (const NetworkMessage& message : listOf(state.network, list)) {
            text.add(list.name, message.body);
        }
    }
    return text.add("end", "").text();
}

SavedState savedStateFrom(std::string_view text) {
    RecordReader reader(text);
    const auto head = reader.next();
    if (!head || head->name != "corvista-saved" || head->number() != kVersion) {
        throw BadRecord("this is no saved state of this version");
    }
    SavedState state;
    for (;;) {
        const auto record = reader.next();
        if (!record) {
            throw BadRecord("a saved state is cut off");
        }
        if (record->name == "end") {
            break;
        }
        takeRecord(*record, state);
    }
    if (state.hostName.size() > kLongestHostName || state.domainName.size() > kLongestHostName) {
        throw BadRecord("a saved name is too long");
    }
    return state;
}

TakenBack takeBack(const SavedState& before, const SavedState* left, const SavedState& began) {
    TakenBack taken;
    std::vector<std::size_t> others;
    const bool isSameSet =
        before.paths() == began.paths() && (left == nullptr || left->paths() == before.paths());
    if (!isSameSet) {
        throw BadRecord("the saved states are of other files");
    }
    const auto indices = filesToPutBack(
        before.files, left != nullptr ? left->files : std::vector<FileState>(), began.files, others);
    // One that did not come to its end may have been put back in part already, by who was killed at it.
    const bool isOfKeeper =
        left == nullptr || std::ranges::any_of(indices, [&before](std::size_t i) {
            return std::ranges::find(before.calls.files, before.files[i].path) != before.calls.files.end();
        });
    const bool isOtherStart = before.boot != bootId() || before.boot != began.boot;
    if (isOtherStart) {
        putBackNameOfStart(before, indices, began, taken.notes);
    }
    const KeeperCalls calls = isOfKeeper ? before.calls : KeeperCalls();
    runCalls(calls.before, taken.notes);
    putBackFiles(before.files, indices, taken.notes);
    runCalls(calls.after, taken.notes);
    const bool isKeeperTold = !calls.before.empty() || !calls.after.empty();
    if (!isOtherStart) {  // then the rest of the kernel has begun anew, or does with what the files say
        putBackNames(before, left, began, taken.notes);
    }
    if (!isOtherStart && before.hasNetwork) {
        constexpr std::uint64_t kThousand = 1000;
        const std::uint64_t now = bootMilliseconds();
        const std::uint64_t seconds = now < before.milliseconds ? 0 : (now - before.milliseconds) / kThousand;
        putBackNetwork({before.network, left != nullptr ? &left->network : nullptr, began.network, seconds,
                        isKeeperTold},
                       taken.notes);
    }
    noteOthersFiles(before, std::move(others), isKeeperTold && !isOtherStart, taken.notes);
    return taken;
}

}  // namespace cvagent::undo
