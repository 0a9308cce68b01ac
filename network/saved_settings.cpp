#include "network/saved_settings.h"

#include "mi/command.h"
#include "mi/line_file.h"
#include "mi/log.h"
#include "mi/text.h"

namespace IC {

namespace {

constexpr char kDirectory[] = "/opt/vantrel/corvista/data";

}  // namespace

void createSettingData(std::string name, std::map<std::string, std::string> settings) {
    const LogScope scope;
    const char* const function = __func__;  // in the closure it would be another
    const std::string path = std::string(kDirectory) + "/ifcfg-" + name;
    log(kProgress) << "createSettingData: FileName " << path;
    LineFile file;
    for (const auto& [key, value] : settings) {
        file.append(key + '=' + trimEnd(value) + '\n');
    }
    const auto tellLines = [&] {
        for (const std::string& line : file.lines()) {
            log(kProgress, function) << "createSettingData: buffer" << line;
        }
    };
    if (!file.write(path, tellLines)) {
        log(kError) << "Can not open Setting File";
    }
}

void deleteSavedConfigurations() {
    const LogScope scope;
    HostCommand listing(formatCommand("ls %s/ifcfg-* 2> /dev/null", kDirectory));
    while (const auto line = listing.nextLine()) {
        const std::string path = trimEnd(*line);
        log(kProgress) << "Deleting " << path;
        if (!HostCommand(formatCommand("rm %s 2> /dev/null", path.c_str())).started()) {
            log(kProgress) << "Could not delete " << path;
        }
    }
}

}  // namespace IC
