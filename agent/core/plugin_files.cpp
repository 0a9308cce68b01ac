#include "agent/core/plugin_files.h"

#include <unistd.h>

#include <algorithm>
#include <filesystem>

#include "agent/core/owners.h"
#include "agent/core/program_path.h"
#include "agent/core/text.h"

namespace cvagent {

namespace {

namespace fs = std::filesystem;

constexpr const char* kFirstPlugin = "libvantrelcvicoshwmi.so.1";
constexpr const char* kPluginDirectory = "corvista/plug-ins";
constexpr const char* kPluginEnding = ".so.1";

/// Whole, however long.
std::string placeName(const fs::path& place) {
    return "'" + printable(place) + "'";
}

/// Who owns the running program decides anyway what it does.
bool ownsTheProgram(uid_t user) {
    struct stat found {};
    return stat("/proc/self/exe", &found) == 0 && found.st_uid == user;
}

/// @param isGoal what is used itself, or the directory that it lies in
std::string whyUnsafePlace(const std::string& place, bool isGoal) {
    struct stat found {};
    if (lstat(place.c_str(), &found) != 0) {
        return placeName(place) + " cannot be looked at";
    }
    if (isSomebodyElses(found) && !ownsTheProgram(found.st_uid)) {
        return placeName(place) + " belongs to somebody else (user " + std::to_string(found.st_uid) + ")";
    }
    const Writers writers = isGoal ? Writers::groupsToo : Writers::everybody;
    return othersCanReplace(place, found, isGoal, writers) ? placeName(place) + " can be written by others"
                                                           : "";
}

/// Of a directory and all those above it.
std::string whyUnsafeWay(const fs::path& directory) {
    std::string reason = whyUnsafePlace(directory, true);
    for (fs::path place = directory; reason.empty() && place != place.parent_path();) {
        place = place.parent_path();
        reason = whyUnsafePlace(place, false);
    }
    return reason;
}

Problem notBeside() {
    const std::string directory = programDirectory();
    return {Problem::failed,
            directory.empty() ? "cannot tell where this program lies, for there is no /proc"
                              : std::string("there is no ") + kFirstPlugin +
                                    " beside this program, which lies in " + inQuotes(directory),
            Problem::pluginSearch};
}

bool isPluginName(const std::string& name) {
    return name.ends_with(kPluginEnding) && !name.starts_with('.');
}

std::vector<fs::path> pluginsIn(const fs::path& directory) {
    std::vector<fs::path> found;
    std::error_code error;
    for (fs::directory_iterator entry(directory, error), end; !error && entry != end;
         entry.increment(error)) {
        if (isPluginName(entry->path().filename())) {
            found.push_back(entry->path());
        }
    }
    std::ranges::sort(found);
    return found;
}

/// A link, such as a library has from its name to its version, is judged by what it leads to: where nobody
/// else can write, nobody else has made it.
std::string whyLeftOut(const fs::path& file) {
    std::error_code error;
    const fs::path target = fs::canonical(file, error);
    return error ? "it leads nowhere" : whyUnsafe(target);
}

void addPluginsIn(const fs::path& directory, PluginFiles& all) {
    const std::string unsafe = whyUnsafeWay(directory);
    for (const fs::path& file : pluginsIn(directory)) {
        const std::string reason = unsafe.empty() ? whyLeftOut(file) : unsafe;
        if (reason.empty()) {
            all.files.push_back(file);
            continue;
        }
        const std::string text = "the plug-in " + placeName(file) + " is left out: " + reason;
        all.leftOut.push_back({file, Problem(Problem::failed, text, Problem::pluginOwner)});
    }
}

}  // namespace

bool isOfThisSystem(const std::string& file) {
    return fs::path(file).filename().string().starts_with(kFirstPlugin);
}

std::string whyUnsafe(const std::string& file) {
    std::error_code error;
    if (!fs::is_regular_file(file, error)) {
        return "it is no regular file";
    }
    const std::string reason = whyUnsafePlace(file, true);
    return reason.empty() ? whyUnsafeWay(fs::path(file).parent_path()) : reason;
}

PluginFiles pluginsBesideProgram() {
    PluginFiles all;
    if (auto first = besideProgram({"../" CORVISTA_LIBDIR, "../lib"}, kFirstPlugin)) {
        all.files.push_back(*std::move(first));
    } else {
        all.leftOut.push_back({kFirstPlugin, notBeside()});
    }
    if (const auto directory = besideProgram({"../" CORVISTA_LIBDIR, "../lib"}, kPluginDirectory)) {
        addPluginsIn(*directory, all);
    }
    if (all.files.empty()) {
        throw Problem(all.leftOut.front().problem);
    }
    return all;
}

}  // namespace cvagent
