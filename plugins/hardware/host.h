#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace hardware {

class Devices;

/// The host as the kernel's files show it: /sys, /proc, /run/udev, /etc. Everything is read below one root,
/// so that a recorded host can stand in for this one. No process is started, nothing is written, no device is
/// opened here: what only devices know has a way of its own.
class Host {
public:
    /// @param root "" for this host, else the directory that holds its sys, proc, etc and run
    /// @param devices what may be asked besides; none: nothing
    explicit Host(std::string root = "", bool privileged = false, std::shared_ptr<Devices> devices = nullptr);

    /// Whether devices may be asked: a recorded host has none.
    bool live() const { return root_.empty(); }
    /// Whether serial numbers and the like may be told.
    bool privileged() const { return privileged_; }
    /// The devices themselves; a null pointer where only files may be read.
    Devices* devices() const { return devices_.get(); }

    /// The first line without blanks at its ends; nothing when the file cannot be read or the line is empty.
    /// Bytes that are no printable text are shown as '?'.
    std::optional<std::string> line(const std::string& path) const;
    static constexpr std::size_t kUsualMost = 1UL << 20;
    /// The whole file, up to `most` bytes.
    std::optional<std::string> text(const std::string& path, std::size_t most = kUsualMost) const;
    std::vector<std::string> lines(const std::string& path) const;
    /// The first line as a decimal number, or with 0x as a hexadecimal one.
    std::optional<unsigned long long> number(const std::string& path) const;
    /// As number, for what can be below zero.
    std::optional<long long> signedNumber(const std::string& path) const;
    /// "0" and "1", "N" and "Y".
    std::optional<bool> flag(const std::string& path) const;
    /// The value behind "KEY=" in a file of such lines.
    std::optional<std::string> field(const std::string& path, const std::string& key) const;
    /// The names in a directory, "eth2" before "eth10"; none when it cannot be read.
    std::vector<std::string> entries(const std::string& directory) const;
    /// The last part of what a link points to.
    std::optional<std::string> target(const std::string& link) const;
    /// Where a path leads when all its links are followed, as a path below the root.
    std::optional<std::string> resolved(const std::string& path) const;
    bool exists(const std::string& path) const;

private:
    std::string root_;
    bool privileged_;
    std::shared_ptr<Devices> devices_;
};

/// Whether "eth2" comes before "eth10": runs of digits count as numbers.
bool comesBefore(const std::string& left, const std::string& right);
/// The text with a '?' for each control character and each byte that is no UTF-8: it goes to terminals and
/// into JSON.
std::string printable(std::string text);
/// The text without blanks and NUL at both ends.
std::string trimmed(const std::string& text);
/// The whole text as a number; nothing for anything else.
std::optional<unsigned long long> asNumber(const std::string& text);
/// As asNumber, for what can be below zero.
std::optional<long long> asSigned(const std::string& text);

}  // namespace hardware
