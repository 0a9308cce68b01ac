// The rules of this code that no compiler checks: who includes whom, one seam to the host, short files.
#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <map>
#include <regex>
#include <set>
#include <sstream>

namespace {

namespace fs = std::filesystem;

const fs::path kTree = CORVISTA_SOURCE_DIR;

const std::map<std::string, std::set<std::string>> kMayInclude = {
    {"framework", {"framework"}},
    {"mi", {"mi", "framework"}},
    {"computer", {"computer", "mi", "framework"}},
    {"storage", {"storage", "mi", "framework"}},
    {"network", {"network", "mi", "framework"}},
    {"indications", {"indications", "mi", "framework"}},
    {"cpu", {"cpu", "mi", "framework"}},
    {"oshwmi", {"oshwmi", "computer", "storage", "network", "indications", "cpu", "mi", "framework"}},
    {"agent/shell", {"agent/shell", "hosttools"}},
    {"agent/core", {"agent/core", "agent/shell", "framework"}},
    {"agent/verify", {"agent/verify", "agent/core", "hosttools", "framework"}},
    {"agent/undo", {"agent/undo", "hosttools"}},
    {"agent/guard", {"agent/guard", "agent/undo", "hosttools"}},
    {"agent/change",
     {"agent/change", "agent/core", "agent/keep", "agent/verify", "agent/shell", "agent/undo", "hosttools",
      "framework"}},
    {"agent/bus", {"agent/bus"}},
    {"agent/keep", {"agent/keep", "agent/bus", "agent/core", "agent/shell", "hosttools", "framework"}},
    {"agent/history", {"agent/history", "agent/core"}},
    {"agent/service",
     {"agent/service", "agent/bus", "agent/change", "agent/core", "agent/history", "agent/undo",
      "agent/verify", "agent/shell", "framework"}},
    {"agent/cli",
     {"agent/cli", "agent/core", "agent/bus", "agent/change", "agent/service", "agent/history", "agent/undo",
      "agent/keep", "agent/verify", "agent/shell", "framework"}},
    {"hosttools", {"hosttools"}},
    {"plugins/hardware", {"plugins/hardware", "framework"}},
};
const std::set<std::string> kPlugin = {"mi",          "computer", "storage", "network",
                                       "indications", "cpu",      "oshwmi"};

/// The innermost component of a file; its first directory where it is in none.
std::string componentOf(const fs::path& file) {
    for (fs::path component = file.parent_path(); !component.empty(); component = component.parent_path()) {
        if (kMayInclude.contains(component)) {
            return component;
        }
    }
    return file.begin()->string();
}

std::vector<fs::path> sources(const std::string& component) {
    std::vector<fs::path> found;
    for (const auto& entry : fs::recursive_directory_iterator(kTree / component)) {
        const bool source = entry.path().extension() == ".cpp" || entry.path().extension() == ".h";
        if (source && componentOf(fs::relative(entry.path(), kTree)) == component) {
            found.push_back(entry.path());
        }
    }
    return found;
}

std::string content(const fs::path& file) {
    std::ostringstream text;
    text << std::ifstream(file).rdbuf();
    return text.str();
}

std::vector<std::string> lines(const fs::path& file) {
    std::vector<std::string> found;
    std::ifstream in(file);
    for (std::string line; std::getline(in, line);) {
        found.push_back(line);
    }
    return found;
}

/// The code without comments and texts, so that a word in a message is no call.
std::string codeOnly(const fs::path& file) {
    static const std::regex noise(R"re("(\\.|[^"\\\n])*"|//[^\n]*|/\*[^*]*\*+([^/*][^*]*\*+)*/)re");
    return std::regex_replace(content(file), noise, "");
}

TEST(CodeRules, ComponentsIncludeOnlyWhatTheyMay) {
    const std::regex include(R"re(^\s*#include "([^"]+)")re");
    for (const auto& [component, allowed] : kMayInclude) {
        const auto files = sources(component);
        EXPECT_FALSE(files.empty()) << component;
        for (const fs::path& file : files) {
            for (const std::string& line : lines(file)) {
                std::smatch match;
                if (std::regex_search(line, match, include)) {
                    EXPECT_TRUE(allowed.contains(componentOf(match[1].str())))
                        << file << " includes " << match[1];
                    EXPECT_EQ(match[1].str().find(".."), std::string::npos) << file << " climbs";
                }
            }
        }
    }
}

TEST(CodeRules, ThePluginHasOneSeamToTheShell) {
    const std::regex call(
        R"re(\b(popen|mypopen|system|execl|execv|execvp|execlp|posix_spawn|fork|vfork)\s*\()re");
    std::set<std::string> seams;
    for (const std::string& component : kPlugin) {
        for (const fs::path& file : sources(component)) {
            if (std::regex_search(codeOnly(file), call)) {
                seams.insert(fs::relative(file, kTree));
            }
        }
    }
    EXPECT_EQ(seams, (std::set<std::string>{"mi/command.cpp", "mi/my_process.cpp", "mi/my_process.h"}));
}

TEST(CodeRules, ThePluginHasOneWayToTheLogger) {
    for (const std::string& component : kPlugin) {
        for (const fs::path& file : sources(component)) {
            if (fs::relative(file, kTree) != "mi/log.cpp") {
                EXPECT_EQ(codeOnly(file).find("LevelMessage"), std::string::npos) << file;
            }
        }
    }
}

/// One reader of whole numbers for the framework and all above it, one for the host tools and what stands in
/// for them, the C library's for what the tools of old print; and one for sizes, which fdisk prints as
/// anything.
TEST(CodeRules, NumbersAreReadInOnePlaceEach) {
    const std::regex call(
        R"re(\b(from_chars|strto(l|ul|ll|ull|f|d|ld|imax|umax)|ato(i|l|ll|f)|sto(i|l|ul|ll|ull|f|d|ld)|sscanf)\s*\()re");
    std::set<std::string> readers;
    for (const auto& [component, allowed] : kMayInclude) {
        for (const fs::path& file : sources(component)) {
            if (std::regex_search(codeOnly(file), call)) {
                readers.insert(fs::relative(file, kTree));
            }
        }
    }
    EXPECT_EQ(readers, (std::set<std::string>{"framework/qx/whole_number.h", "hosttools/files.cpp",
                                              "mi/text.cpp", "storage/drive_nodes.cpp"}));
}

TEST(CodeRules, TheAgentsLibraryPrintsNothingAndEndsNothing) {
    const std::regex edge(
        R"re(\b(std::c(err|out|in)|f?printf|puts|exit|_exit|set_terminate|abort|isatty)\b)re");
    for (const fs::path& file : sources("agent/core")) {
        const std::string code = codeOnly(file);
        EXPECT_FALSE(std::regex_search(code, edge)) << file;
        // By the signal that ended it.
        EXPECT_TRUE(file.filename() == "signals.cpp" || code.find("_Exit") == std::string::npos) << file;
    }
}

TEST(CodeRules, TheAgentChangesItsProcessInTheSetUpAlone) {
    const std::regex change(
        R"re(\b(setenv|putenv|unsetenv|clearenv|f?chdir|umask|dup2|unshare|u?mount2?|sigaction|signal|sigprocmask|setrlimit|setitimer|prctl)\s*\()re");
    const std::regex step(
        R"re(\b(prepareSurroundings|nameInEnvironment|makeTmpPrivate|setUpCommands|putAdaptersOnPath)\()re");
    std::set<std::string> changing;
    std::set<std::string> callers;
    for (const std::string component : {"agent/core", "agent/cli", "agent/bus", "agent/service"}) {
        for (const fs::path& file : sources(component)) {
            const std::string code = codeOnly(file);
            if (std::regex_search(code, change)) {
                changing.insert(file.filename());
            } else if (file.extension() == ".cpp" && std::regex_search(code, step)) {
                callers.insert(file.filename());
            }
        }
    }
    // Those of the service: the child that becomes its bus, and who takes the signals.
    EXPECT_EQ(changing, (std::set<std::string>{"data_directory.cpp", "environment.cpp", "host_tools.cpp",
                                               "private_bus.cpp", "private_tmp.cpp", "signals.cpp",
                                               "stop_request.cpp", "surroundings.cpp"}));
    EXPECT_EQ(callers, (std::set<std::string>{"main.cpp", "process.cpp"}));
}

TEST(CodeRules, TheAgentsLibraryGivesNoAdviceForOneFrontEnd) {
    const std::regex advice(R"re("[^"\n]*(sudo |ulimit|--[a-z]|\bcvagent[: ]|=DIRECTORY))re");
    for (const fs::path& file : sources("agent/core")) {
        EXPECT_FALSE(std::regex_search(content(file), advice)) << file;
    }
}

TEST(CodeRules, FrontEndsReadAndWriteThroughTheAgent) {
    for (const fs::path& file : sources("agent/cli")) {
        for (const char* call : {"getProperty(", "setProperty(", "holdAll("}) {
            EXPECT_EQ(codeOnly(file).find(call), std::string::npos) << file << " calls " << call;
        }
    }
}

TEST(CodeRules, SourcesAndHeadersStayShort) {
    for (const auto& [component, allowed] : kMayInclude) {
        for (const fs::path& file : sources(component)) {
            const std::size_t longest = file.extension() == ".h" ? 150 : 400;
            EXPECT_LE(lines(file).size(), longest) << file;
        }
    }
}

/// Every "Suite.Name" of the tests.
std::set<std::string> namesOfTests() {
    static const std::regex test(R"((?:HOST_)?TEST(?:_F|_P)?\(\s*(\w+),\s*(\w+)\))");
    std::set<std::string> names;
    for (const auto& entry : fs::recursive_directory_iterator(kTree / "tests")) {
        if (entry.path().extension() == ".cpp") {
            const std::string text = content(entry.path());
            for (std::sregex_iterator at(text.begin(), text.end(), test), end; at != end; ++at) {
                names.insert((*at)[1].str() + '.' + (*at)[2].str());
            }
        }
    }
    return names;
}

/// Whether a row's last column names something that is there, be it the tests of the row above.
void expectNamesTests(const std::string& column, const std::set<std::string>& tests) {
    static const std::regex quoted("`([^`]+)`");
    bool any = column.find("the same") != column.npos;
    for (std::sregex_iterator at(column.begin(), column.end(), quoted), end; at != end; ++at) {
        const std::string name = (*at)[1];
        any = true;
        if (name.ends_with(".*")) {
            const std::string suite = name.substr(0, name.size() - 1);
            const auto first = tests.lower_bound(suite);
            EXPECT_TRUE(first != tests.end() && first->starts_with(suite)) << name;
        } else {
            EXPECT_TRUE(tests.contains(name) || fs::exists(kTree / name)) << name;
        }
    }
    EXPECT_TRUE(any) << column;
}

TEST(CodeRules, EveryAttackThatThePageOnSecurityNamesIsPlayed) {
    const std::set<std::string> tests = namesOfTests();
    std::size_t rows = 0;
    for (const std::string& line : lines(kTree / "docs/security.md")) {
        if (line.starts_with("|") && line != "|---|---|---|" && !line.ends_with("| Test |")) {
            const std::string row = line.substr(0, line.size() - 1);
            expectNamesTests(row.substr(row.rfind('|')), tests);
            ++rows;
        }
    }
    EXPECT_GT(rows, 40U);
}

}  // namespace
