#include "agent/change/name_service.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <sstream>

#include "agent/change/cannot.h"
#include "agent/change/tree_copy.h"
#include "hosttools/descriptor.h"
#include "hosttools/text.h"

namespace cvagent::change {

namespace {

using hosttools::Descriptor;

constexpr const char* kNameSettings = "/etc/nsswitch.conf";
constexpr std::array kLocal = {"files", "compat", "db", "myhostname"};
constexpr std::size_t kLargest = 65536;
constexpr mode_t kMode = 0644;

std::string readSettings() {
    const Descriptor file(openRegular(AT_FDCWD, kNameSettings));
    std::string text(kLargest, '\0');
    const ssize_t got = file.isOpen() ? read(file.get(), text.data(), text.size()) : 0;
    text.resize(static_cast<std::size_t>(std::max<ssize_t>(got, 0)));
    return text;
}

}  // namespace

std::string withoutServers(std::string_view settings) {
    std::istringstream lines{std::string(settings)};
    std::string kept;
    bool hosts = false;
    for (std::string line; std::getline(lines, line);) {
        std::istringstream words(line.substr(0, line.find('#')));
        std::string database;
        if (!(words >> database) || !database.ends_with(':')) {
            continue;
        }
        std::string local;
        for (std::string word; words >> word;) {
            local += std::ranges::find(kLocal, word) != kLocal.end() ? " " + word : "";
        }
        kept += database + (local.empty() ? " files" : local) + "\n";
        hosts = hosts || database == "hosts:";
    }
    return hosts ? kept : kept + "hosts: files\n";
}

void askNoNameServer() {
    const std::string settings = withoutServers(readSettings());
    if (access("/etc", F_OK) != 0) {
        return;
    }
    unlink(kNameSettings);
    const Descriptor file(open(kNameSettings, O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, kMode));
    must(file.get(), "names cannot be looked up without name servers");
    if (!hosttools::writeAll(file.get(), settings)) {
        throw Cannot("names cannot be looked up without name servers");
    }
}

}  // namespace cvagent::change
