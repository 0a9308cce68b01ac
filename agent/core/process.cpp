#include "agent/core/process.h"

#include <filesystem>
#include <utility>

#include "agent/core/environment.h"
#include "agent/core/private_tmp.h"
#include "agent/core/program_path.h"
#include "agent/core/signals.h"

namespace cvagent {

PreparedProcess::PreparedProcess(ProcessSettings settings) {
    for (auto* file : {&settings.log.file, &settings.log.traceFile}) {
        if (*file) {
            settings.files.push_back(&**file);
        }
    }
    prepareSurroundings(settings.files);
    data_ = std::make_shared<DataDirectory>(settings.waitForData);
    data_->nameInEnvironment();
    quiet_.emplace();
    log_ = std::make_shared<LogOutput>(settings.log, errors_);  // before /tmp becomes another one
    makeTmpPrivate(keptPlaces(settings));
    setUpCommands(settings.commands);
    StopSignals::install();
    if (settings.hostTools != HostTools::native) {
        std::vector<ToolReport> reports =
            inspectHostTools(settings.hostTools, Look::adapters, adapterDirectory());
        if (settings.linksMayCome && settings.hostTools == HostTools::automatic) {
            findLinksOfAnyName(reports);
        }
        putAdaptersOnPath(reports);
    }
}

AgentSettings PreparedProcess::agentSettings() const& {
    AgentSettings settings;
    settings.data = data_;
    settings.log = log_;
    return settings;
}

/// What the agent needs of the /tmp that everybody sees, should it lie there.
std::vector<std::string> PreparedProcess::keptPlaces(const ProcessSettings& settings) const {
    std::vector<std::string> places = directoriesOnPath();
    for (const std::string* file : settings.files) {
        places.push_back(*file);
    }
    const std::filesystem::path adapters = adapterDirectory().value_or("");
    // In a build tree the programs that it starts lie in the other one of its two directories.
    const std::filesystem::path others = besideProgram({".."}, "agent").value_or("");
    places.insert(places.end(), {programDirectory(), others, data_->path(), adapters.parent_path()});
    return places;
}

}  // namespace cvagent
