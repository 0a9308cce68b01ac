#pragma once

#include <string>

#include "plugins/hardware/hardware_mi.h"

/// A host made of files in a directory of its own, which goes with this object.
class RecordedHost {
public:
    RecordedHost();
    RecordedHost(const RecordedHost&) = delete;
    RecordedHost& operator=(const RecordedHost&) = delete;
    ~RecordedHost();

    /// A file with its directories; a newline is put behind the text, as the kernel does.
    void file(const std::string& path, const std::string& text) const;
    void link(const std::string& path, const std::string& target) const;
    void remove(const std::string& path) const;
    /// Makes the files that a list names; its format is told in hosts/README.md.
    void unpack(const std::string& list) const;

    const std::string& root() const { return root_; }
    hardware::Host host(bool privileged = true) const { return hardware::Host(root_, privileged); }

private:
    std::string root_;
};

/// The facts that a source tells of one thing, as "Name: value unit" in lines; "" for nothing.
std::string told(const hardware::Host& host, hardware::Class type, const std::string& name = "");
/// One of these facts without its unit; "" when it is not told.
std::string told(const hardware::Host& host, hardware::Class type, const std::string& name,
                 const std::string& property);
/// The names that a source lists.
std::vector<std::string> listed(const hardware::Host& host, hardware::Class type);
const hardware::Source& sourceOf(hardware::Class type);
