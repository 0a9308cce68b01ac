#include "tests/change/rehearsed.h"

#include <gtest/gtest.h>
#include <sys/mount.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <sstream>

namespace fs = std::filesystem;
using cvagent::change::Change;
using cvagent::change::FileState;
using cvagent::change::Plan;

namespace {

constexpr std::chrono::seconds kLongest(100);
constexpr const char* kRecords = "/opt/vantrel/corvista/data/record";

std::string content(const fs::path& file) {
    std::ostringstream text;
    text << std::ifstream(file).rdbuf();
    return text.str();
}

/// A monitor writes the one when it likes, the agent another one, and the test's tools the rest.
bool isNobodysWrite(const fs::path& path) {
    return path.string().starts_with(std::string(kRecords)) ||
           path.filename().string().find("oshwminetind.dat") != std::string::npos ||
           path.filename() == ".lock";
}

}  // namespace

Plan rehearsed(const std::vector<Change>& changes, const std::string& plugin, cvagent::HostTools tools) {
    cvagent::change::RehearsalSettings settings;
    settings.hostTools = tools;
    settings.plugins = {plugin};
    settings.program = REHEARSAL_PROGRAM;
    settings.longest = kLongest;
    return cvagent::change::rehearse(settings, changes);
}

std::string whyNotRehearsed(const std::vector<Change>& changes, const std::string& plugin,
                            cvagent::HostTools tools) {
    try {
        rehearsed(changes, plugin, tools);
        return "";
    } catch (const cvagent::change::CannotRehearse& reason) {
        return reason.what();
    }
}

void moveRecords(FakeHost& host) {
    host.directory(fs::path(kRecords).parent_path());
    fs::rename("/record", kRecords);
    host.symlink("/record", kRecords);
}

void enterJail(FakeHost& host) {
    host.directory("/jail");
    ASSERT_EQ(mount("/", "/jail", nullptr, MS_BIND | MS_REC, nullptr), 0);
    ASSERT_EQ(chroot("/jail"), 0);
}

std::map<std::string, std::string> writtenPart(const FakeHost& /*host*/) {
    std::map<std::string, std::string> files;
    for (const char* place : {"/etc", "/opt/vantrel/corvista/data"}) {
        std::error_code none;
        for (const auto& entry : fs::recursive_directory_iterator(place, none)) {
            if (entry.is_symlink()) {
                files[entry.path()] = "-> " + fs::read_symlink(entry.path()).string();
            } else if (entry.is_regular_file() && !isNobodysWrite(entry.path())) {
                files[entry.path()] = content(entry.path());
            }
        }
    }
    return files;
}

std::map<std::string, std::string> filesAfter(const Plan& plan) {
    std::map<std::string, std::string> files;
    for (const auto& file : plan.files) {
        const bool known = !isNobodysWrite(file.path);
        if (known && file.after && file.after->type != FileState::Type::directory) {
            files[file.path] = (file.after->type == FileState::Type::link ? "-> " : "") + file.after->content;
        }
    }
    return files;
}

std::string joinedLines(const std::vector<std::string>& lines) {
    std::string text;
    for (const std::string& line : lines) {
        text += line + '\n';
    }
    return text;
}
