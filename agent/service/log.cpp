#define SD_JOURNAL_SUPPRESS_LOCATION
#include "agent/service/log.h"

#include <sys/stat.h>
#include <sys/uio.h>
#include <systemd/sd-journal.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <string_view>

#include "agent/core/surroundings.h"
#include "agent/core/text.h"

namespace cvagent::service {

namespace {

bool toJournal = false;  // set before there are threads

/// Control characters are spelt out, so that a name of the host forges no line.
std::string inOneLine(const std::string& text) {
    std::string line = text;
    std::replace(line.begin(), line.end(), '\n', ' ');
    return printable(line);
}

void sendToJournal(Priority priority, const std::string& line, const std::vector<LogField>& fields) {
    std::vector<std::string> entries = {"MESSAGE=" + line,
                                        "PRIORITY=" + std::to_string(static_cast<int>(priority)),
                                        "SYSLOG_IDENTIFIER=cvagentd"};
    for (const auto& [name, value] : fields) {
        entries.push_back(name + "=" + value);
    }
    std::vector<iovec> parts;
    parts.reserve(entries.size());
    for (std::string& entry : entries) {
        parts.push_back({entry.data(), entry.size()});
    }
    sd_journal_sendv(parts.data(), static_cast<int>(parts.size()));
}

}  // namespace

void findJournal() {
    const char* stream = std::getenv("JOURNAL_STREAM");
    struct stat found {};
    if (stream != nullptr && fstat(STDERR_FILENO, &found) == 0) {
        toJournal = stream == std::to_string(found.st_dev) + ":" + std::to_string(found.st_ino);
    }
}

void log(Priority priority, const std::string& text, const std::vector<LogField>& fields) {
    const std::string line = inOneLine(text);
    if (toJournal) {
        sendToJournal(priority, line, fields);
        return;
    }
    const std::string whole = "cvagentd: " + line + "\n";
    [[maybe_unused]] const ssize_t written = write(messageDescriptor(), whole.data(), whole.size());
}

void noteWrite(Priority priority, const Deed& deed, const std::string& text, const std::string& verdict) {
    log(priority, text,
        {{"CORVISTA_NODE", deed.node},
         {"CORVISTA_PROPERTY", deed.property},
         {"CORVISTA_CALLER_UID", std::to_string(deed.user)},
         {"CORVISTA_VERDICT", verdict}});
}

}  // namespace cvagent::service
