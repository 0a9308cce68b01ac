#pragma once

#include <string>
#include <string_view>

/// A directory that goes away with its object.
class TemporaryDirectory {
public:
    TemporaryDirectory();
    TemporaryDirectory(const TemporaryDirectory&) = delete;
    TemporaryDirectory& operator=(const TemporaryDirectory&) = delete;
    ~TemporaryDirectory();
    const std::string& path() const { return path_; }

private:
    std::string path_;
};

/// A host's /sys/block and /run/udev/data as files of a temporary directory.
/// A recording has one line for each line of a file, "path content"; "#" begins a comment.
class HostTree {
public:
    HostTree() = default;
    explicit HostTree(const std::string& recordedHost);

    const std::string& root() const { return directory_.path(); }
    void add(std::string_view recording);
    void addBytes(const std::string& path, std::string_view bytes);

private:
    TemporaryDirectory directory_;
};

/// @return a file of the recordings; fails the test when there is none
std::string recording(const std::string& name);
/// Compares text with a recording, or writes the recording anew when HOSTTOOLS_REWRITE is set.
void expectRecorded(const std::string& name, const std::string& text);
