#include "tests/hosttools/host_tree.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>

namespace fs = std::filesystem;

namespace {

const fs::path kRecordings = HOSTTOOLS_RECORDINGS;

/// The links through which lsblk finds a device by its number and tells a disk from a partition.
void linkDevice(const fs::path& root, const fs::path& file, const std::string& number) {
    const fs::path device = file.parent_path();
    fs::create_directories(root / "sys/dev/block");
    fs::create_directory_symlink(fs::path("../../block") / fs::relative(device, root / "sys/block"),
                                 root / "sys/dev/block" / number);
    if (device.parent_path() == root / "sys/block")
        fs::create_directory_symlink("../../block", device / "subsystem");
}

}  // namespace

TemporaryDirectory::TemporaryDirectory() {
    std::string name = (fs::temp_directory_path() / "hosttools-XXXXXX").string();
    EXPECT_NE(mkdtemp(name.data()), nullptr);
    path_ = name;
}

TemporaryDirectory::~TemporaryDirectory() {
    std::error_code ignored;
    fs::remove_all(path_, ignored);
}

HostTree::HostTree(const std::string& recordedHost) {
    add(recording("hosts/" + recordedHost + ".tree"));
}

void HostTree::add(std::string_view text) {
    std::istringstream lines{std::string(text)};
    for (std::string line; std::getline(lines, line);) {
        if (line.empty() || line.starts_with('#')) continue;
        const std::size_t blank = line.find(' ');
        const fs::path file = fs::path(root()) / line.substr(0, blank);
        const std::string content = line.substr(blank + 1);
        fs::create_directories(file.parent_path());
        std::ofstream(file, std::ios::app) << content << '\n';
        if (file.filename() == "dev") linkDevice(root(), file, content);
    }
}

void HostTree::addBytes(const std::string& path, std::string_view bytes) {
    const fs::path file = fs::path(root()) / path;
    fs::create_directories(file.parent_path());
    std::ofstream(file, std::ios::binary) << bytes;
}

std::string recording(const std::string& name) {
    std::ifstream file(kRecordings / name);
    EXPECT_TRUE(file.is_open()) << "no recording " << name;
    std::ostringstream text;
    text << file.rdbuf();
    return text.str();
}

void expectRecorded(const std::string& name, const std::string& text) {
    if (std::getenv("HOSTTOOLS_REWRITE") != nullptr) std::ofstream(kRecordings / name) << text;
    EXPECT_EQ(text, recording(name)) << name;
}
