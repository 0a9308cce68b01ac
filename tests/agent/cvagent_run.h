#pragma once

#include <string>
#include <vector>

#include "tests/support/fake_host.h"

/// cvagent with the fake plug-in, on the fake host.
class CvagentRun {
public:
    explicit CvagentRun(FakeHost& host) : host_(host) {}

    /// Words for the fake plug-in.
    CvagentRun& telling(const std::string& words) {
        words_ = words;
        return *this;
    }
    CvagentRun& plugin(const std::string& file) {
        plugin_ = file;
        return *this;
    }
    CvagentRun& setting(const std::string& variable) {
        settings_.push_back(variable);
        return *this;
    }

    Finished operator()(const std::vector<std::string>& words) { return host_.run(commandLine(words)); }
    RunningProgram start(const std::vector<std::string>& words) { return host_.start(commandLine(words)); }

    /// What the fake plug-in has noted so far, one line each.
    std::string diary() const { return host_.read(kDiary).value_or(""); }

    std::vector<std::string> commandLine(const std::vector<std::string>& words) const {
        std::vector<std::string> line = {"env", std::string("CORVISTA_FAKE_PLUGIN_DIARY=") + kDiary,
                                         "CORVISTA_FAKE_PLUGIN=" + words_};
        line.insert(line.end(), settings_.begin(), settings_.end());
        line.insert(line.end(), {CVAGENT_PROGRAM, "--host-tools", "native", "--plugin", plugin_});
        line.insert(line.end(), words.begin(), words.end());
        return line;
    }

private:
    static constexpr const char* kDiary = "/var/diary";

    FakeHost& host_;
    std::string words_;
    std::string plugin_ = FAKE_PLUGIN_FILE;
    std::vector<std::string> settings_;
};
