#pragma once

#include <condition_variable>
#include <functional>
#include <memory>
#include <mutex>

#include "plugins/hardware/storage/device_access.h"

namespace hardware_test {

/// Devices that answer what a test gives them, and write down what they were asked.
class FakeDevices : public hardware::DeviceAccess {
public:
    using Command = std::vector<std::uint8_t>;

    std::function<std::optional<std::string>(const hardware::DeviceFile&)> nvme;
    std::function<std::optional<hardware::ScsiAnswer>(const Command&)> drive;
    std::function<std::optional<hardware::Room>(const std::string&)> space;
    std::function<Contents(const hardware::DeviceFile&)> inside;
    std::function<hardware::Neighbours()> lldp;

    std::optional<std::string> nvmeLog(const hardware::DeviceFile& controller, unsigned int page,
                                       std::size_t size) const override {
        note("nvme log " + std::to_string(page) + " of " + std::to_string(size) +
             " bytes: " + named(controller));
        return nvme ? nvme(controller) : std::nullopt;
    }
    std::optional<hardware::ScsiAnswer> scsi(const hardware::DeviceFile& file, const Command& command,
                                             std::size_t /*size*/) const override {
        note(hexadecimal(command) + ": " + named(file));
        return drive ? drive(command) : std::nullopt;
    }
    std::optional<hardware::Room> room(const std::string& where) const override {
        note("room: " + where);
        return space ? space(where) : std::nullopt;
    }
    Contents contents(const hardware::DeviceFile& device) const override {
        note("contents: " + named(device));
        return inside ? inside(device) : Contents();
    }
    hardware::Neighbours neighbours() const override {
        note("neighbours");
        return lldp ? lldp() : hardware::Neighbours();
    }

    std::vector<std::string> asked() const {
        const std::lock_guard lock(guard_);
        return asked_;
    }

private:
    static std::string named(const hardware::DeviceFile& file) {
        const bool block = file.sort == hardware::DeviceFile::Sort::block;
        return file.path + " " + file.number + (block ? "" : " character");
    }
    static std::string hexadecimal(const Command& command) {
        constexpr const char* kDigits = "0123456789abcdef";
        std::string text;
        for (const std::uint8_t byte : command) {
            text += {kDigits[byte >> 4U], kDigits[byte & 15U]};
        }
        return text;
    }
    void note(const std::string& text) const {
        const std::lock_guard lock(guard_);
        asked_.push_back(text);
    }

    mutable std::mutex guard_;
    mutable std::vector<std::string> asked_;  // guarded
};

/// A place where a device hangs until it is let go.
class Gate {
public:
    void wait() {
        std::unique_lock lock(guard_);
        opened_.wait(lock, [this] { return open_; });
    }
    void open() {
        const std::lock_guard lock(guard_);
        open_ = true;
        opened_.notify_all();
    }

private:
    std::mutex guard_;
    std::condition_variable opened_;
    bool open_ = false;
};

}  // namespace hardware_test
