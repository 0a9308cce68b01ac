#include "agent/keep/way.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <system_error>

#include "agent/core/text.h"
#include "agent/keep/host_files.h"
#include "agent/keep/manager.h"
#include "agent/keep/replace_file.h"

namespace cvagent::keep {

namespace {

namespace fs = std::filesystem;

struct SystemsWay {
    const char* system;
    Way (*way)(const Link&, const Claim&, const Wish&);
};
constexpr std::array kWays = {SystemsWay{"NetworkManager", wayOfNetworkManager},
                              SystemsWay{"netplan", wayOfNetplan},
                              SystemsWay{"systemd-networkd", wayOfNetworkd},
                              SystemsWay{"wicked", wayOfWicked}, SystemsWay{"ifupdown", wayOfIfupdown}};

std::string lastLineOf(const std::string& text) {
    const std::size_t end = text.find_last_not_of(" \t\r\n") + 1;
    const std::size_t begin = end == 0 ? 0 : text.find_last_of('\n', end - 1) + 1;
    return text.substr(begin, end - begin);
}

/// By the program's own popen, which knows of deadlines and of commands that only are to be told.
void call(const std::string& command) {
    constexpr std::size_t kMostSaid = 65536;
    FILE* const output = popen((command + " 2>&1").c_str(), "re");
    if (output == nullptr) {
        throw CannotKeep(command + " could not be started: " + std::strerror(errno));
    }
    std::string said;
    std::array<char, 4096> part{};
    for (std::size_t got = 1; got > 0;) {
        got = fread(part.data(), 1, part.size(), output);
        said.append(part.data(), got);
        if (said.size() > kMostSaid) {
            said.erase(0, said.size() - kMostSaid);
        }
    }
    if (pclose(output) != 0) {
        throw CannotKeep(command + " has failed: " + inQuotes(lastLineOf(said)));
    }
}

void put(const FileEdit& edit) {
    const auto now = smallFile(edit.path);
    if (now == edit.after) {
        return;
    }
    if (now != edit.before) {
        throw CannotKeep(edit.path + " has been changed meanwhile");
    }
    if (!edit.after) {
        fs::remove(edit.path);
    } else {
        fs::create_directories(fs::path(edit.path).parent_path());
        replaceFile(edit.path, *edit.after, edit.like);
    }
    if (smallFile(edit.path) != edit.after) {
        throw CannotKeep(edit.path + " is not what was written to it");
    }
}

void putAll(const std::vector<FileEdit>& files) {
    for (const FileEdit& each : files) {
        if (each.isChange()) {
            try {
                put(each);
            } catch (const std::system_error& error) {
                throw CannotKeep("cannot write " + each.path + ": " + error.code().message());
            }
        }
    }
}

/// As far as it goes: what is in the way of one step does not keep the others from being done.
std::string takeBack(const Way& way) {
    std::string problems;
    const auto trying = [&problems](const auto& step) {
        try {
            step();
        } catch (const CannotKeep& cannot) {
            problems += std::string("; and taking it back: ") + cannot.what();
        }
    };
    for (FileEdit each : way.back().files) {
        each.before = way.request ? smallFile(each.path) : each.before;  // whatever the daemon has written
        if (smallFile(each.path) != each.after) {
            trying([&each] { putAll({each}); });
        }
    }
    if (way.request) {
        trying(way.request->readAgain);
        return problems;
    }
    for (const std::string& each : way.callsAfter) {
        trying([&each] { call(each); });
    }
    return problems;
}

void ask(const Request& request) {
    if (const auto* tell = toldInstead()) {
        std::ranges::for_each(request.words, *tell);
    } else {
        request.make();
    }
}

}  // namespace

bool Way::isEmpty() const {
    return !request && std::ranges::none_of(files, &FileEdit::isChange);
}

Way Way::back() const {
    Way way = *this;
    for (FileEdit& each : way.files) {
        std::swap(each.before, each.after);
    }
    std::ranges::reverse(way.files);
    return way;
}

Way wayToKeep(const Link& link, const Keeper& keeper, const Wish& wish) {
    const std::string system = keeper.system();
    if (!keeper.unknown.empty()) {
        throw CannotKeep(keeper.unknown[0]);
    }
    if (keeper.claims.size() > 1) {
        throw CannotKeep(keeper.claims[0].system + " and " + keeper.claims[1].system + " both have " +
                         inQuotes(link.name));
    }
    if (system.empty()) {
        throw CannotKeep("no system keeps " + inQuotes(link.name));
    }
    const auto* found =
        std::ranges::find_if(kWays, [&system](const SystemsWay& each) { return system == each.system; });
    if (found == kWays.end()) {
        throw CannotKeep(system + " is not known");
    }
    checkName(link.name);
    check(wish);
    return found->way(link, keeper.claims[0], wish);
}

void go(const Way& way) {
    if (way.isEmpty() && !way.isAlwaysTold) {
        return;
    }
    try {
        std::ranges::for_each(way.callsBefore, call);
        putAll(way.files);
        if (way.request) {
            ask(*way.request);
        } else {
            std::ranges::for_each(way.callsAfter, call);
        }
    } catch (const NotBegun&) {
        throw;
    } catch (const CannotKeep& cannot) {
        throw CannotKeep(cannot.what() + takeBack(way));
    }
}

}  // namespace cvagent::keep
