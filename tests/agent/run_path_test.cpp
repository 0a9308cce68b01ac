// Where the dynamic loader looks for what the built and the installed programs need.
#include <gmock/gmock.h>

#include <cstdlib>
#include <filesystem>

#include "tests/support/fake_host.h"
#include "tests/support/shell.h"

namespace {

namespace fs = std::filesystem;
using testing::HasSubstr;
using testing::Not;

/// Between colons; empty when the file has none.
std::string runPath(const std::string& file) {
    const std::string path =
        shell("readelf -dW '" + file + "' | sed -n 's/.*(RU\\?N\\?PATH).*\\[\\(.*\\)\\]/\\1/p'").out;
    return path.empty() ? "" : ":" + path.substr(0, path.find('\n')) + ":";
}

/// The program or library that the loader takes for one that a file needs.
std::string found(const std::string& file, const std::string& library) {
    const std::string path =
        shell("ldd '" + file + "' | sed -n 's/.*" + library + " => \\(.*\\) (.*/\\1/p'").out;
    std::error_code missing;
    return fs::canonical(path.substr(0, path.find('\n')), missing);
}

void expectSoundPaths(const std::vector<std::string>& files) {
    for (const std::string& file : files) {
        ASSERT_TRUE(fs::exists(file)) << file;
        EXPECT_THAT(runPath(file), Not(HasSubstr("::")))
            << file << ": an empty entry is the current directory";
    }
}

TEST(RunPath, OfTheBuildHasNoEmptyEntry) {
    expectSoundPaths({CVAGENT_PROGRAM, CORVISTA_PLUGIN_FILE, FRAMEWORK_FILE, HOSTTOOLS_PROGRAM});
}

TEST(RunPath, OfTheInstallationFindsTheFrameworkBesideThePlugin) {
    std::string place = (fs::temp_directory_path() / "cvagent-install-XXXXXX").string();
    ASSERT_NE(mkdtemp(place.data()), nullptr);
    const Shell install =
        shell("'" CMAKE_PROGRAM "' --install '" + buildDirectory() + "' --prefix '" + place + "' 2>&1");
    ASSERT_EQ(install.status, 0) << install.out;
    std::vector<std::string> files = {place + "/libexec/cvagent", place + "/bin/cvagent",
                                      place + "/lib/corvista/corvista-hosttools"};
    std::string libraries;
    for (const auto& entry : fs::recursive_directory_iterator(place)) {
        if (entry.path().filename().string().starts_with("libvantrel") && !entry.is_symlink()) {
            files.push_back(entry.path());
            libraries = entry.path().parent_path();
        }
    }
    EXPECT_EQ(files.size(), 5U);
    expectSoundPaths(files);
    const std::string plugin = libraries + "/libvantrelcvicoshwmi.so.1";
    const std::string framework = fs::canonical(libraries + "/libvantrelcvframework.so.1");
    EXPECT_EQ(runPath(plugin), ":$ORIGIN:");
    EXPECT_EQ(found(plugin, "libvantrelcvframework.so.1"), framework);
    EXPECT_EQ(found(files[0], "libvantrelcvframework.so.1"), framework);
    EXPECT_EQ(shell("'" + files[1] + "' --version").out, "cvagent 1.0.0\n") << "which the other one says";
    fs::remove_all(place);
}

}  // namespace
