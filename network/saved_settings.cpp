#include "network/saved_settings.h"

#include "mi/command.h"
#include "mi/line_file.h"
#include "mi/log.h"
#include "mi/text.h"

namespace IC {

namespace {

constexpr char kDirectory[] = "/opt/vantrel/corvista/data";

std::string pathOf(const std::string& name) {
    return std::string(kDirectory) + "/ifcfg-" + name;
}

/// Whether a file of this name would be in another directory.
bool leadsAway(const std::string& name) {
    return contains(name, "/") || contains(name, "..");
}

/// Whether a line that `ls` printed is the path of one of our files. It may also be a file in a directory, or
/// part of a name with a line break, which would be removed from the agent's working directory.
bool isSavedFile(const std::string& path) {
    const std::string start = pathOf("");
    return path.starts_with(start) && !contains(path.substr(start.size()), "/");
}

}  // namespace

void createSettingData(std::string name, std::map<std::string, std::string> settings) {
    const LogScope scope;
    const std::string path = pathOf(name);
    log(kProgress) << "createSettingData: FileName " << path;
    LineFile file;
    for (const auto& [key, value] : settings) {
        file.append(key + '=' + trimEnd(value) + '\n');
    }
    const auto tellLines = [&] {
        for (const std::string& line : file.lines()) {
            log(kProgress) << "createSettingData: buffer" << line;
        }
    };
    if (leadsAway(name) || !file.write(path, tellLines)) {
        log(kError) << "Can not open Setting File";
    }
}

void deleteSavedConfigurations() {
    const LogScope scope;
    HostCommand listing(formatCommand("ls %s/ifcfg-* 2> /dev/null", kDirectory));
    while (const auto line = listing.nextLine()) {
        const std::string path = trimEnd(*line);
        if (!isSavedFile(path)) {
            continue;
        }
        log(kProgress) << "Deleting " << path;
        if (!HostCommand(formatCommand("rm %s 2> /dev/null", path)).started()) {
            log(kProgress) << "Could not delete " << path;
        }
    }
}

}  // namespace IC
