#pragma once

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <memory>
#include <stdexcept>
#include <string>

#include "plugins/hardware/storage/devices.h"
#include "tests/hardware/fake_devices.h"
#include "tests/support/files.h"

namespace hardware_test {

/// A small host below a directory of its own, with devices that a test answers for.
class StorageHost {
public:
    StorageHost() {
        const bool memory = std::filesystem::is_directory("/dev/shm");  // many small files, made and removed
        std::string path =
            (memory ? std::filesystem::path("/dev/shm") : std::filesystem::temp_directory_path()) /
            "storage-host-XXXXXX";
        if (mkdtemp(path.data()) == nullptr) {
            throw std::runtime_error("no directory for a host");
        }
        root_ = path;
    }
    ~StorageHost() {
        std::error_code ignored;
        std::filesystem::remove_all(root_, ignored);
    }
    StorageHost(const StorageHost&) = delete;
    StorageHost& operator=(const StorageHost&) = delete;

    void file(const std::string& path, const std::string& content) const {
        fake_host::makeParents(root_ + path);
        std::ofstream(root_ + path, std::ios::binary) << content << '\n';
    }
    void link(const std::string& path, const std::string& to) const {
        fake_host::makeParents(root_ + path);
        std::filesystem::create_symlink(root_ + to, root_ + path);
    }
    void remove(const std::string& path) const { std::filesystem::remove_all(root_ + path); }
    /// A block device without a partition table: a directory below /sys/devices and its link.
    void block(const std::string& name, const std::string& bus, const std::string& number,
               const std::string& sectors = "2048") const {
        const std::string directory = "/sys/devices/" + bus + "/block/" + name;
        file(directory + "/dev", number);
        file(directory + "/size", sectors);
        file("/sys/devices/" + bus + "/type", "0");
        file("/sys/devices/" + bus + "/state", "running");
        link(directory + "/device", "/sys/devices/" + bus);
        link("/sys/class/block/" + name, directory);
    }
    void partition(const std::string& holder, const std::string& name, const std::string& number) const {
        const std::string directory =
            std::filesystem::canonical(root_ + "/sys/class/block/" + holder).string();
        const std::string inside = directory.substr(root_.size()) + "/" + name;
        file(inside + "/dev", number);
        file(inside + "/partition", "1");
        file(inside + "/size", "1024");
        link("/sys/class/block/" + name, inside);
    }

    /// The host as root sees it; its devices are waited for as long as told, and what they say is not kept.
    hardware::Host asRoot(std::chrono::milliseconds patience = std::chrono::seconds(20),
                          std::chrono::milliseconds kept = std::chrono::milliseconds(0)) const {
        const hardware::Devices::Times times{patience, kept, kept, kept};
        return hardware::Host(root_, true, std::make_shared<hardware::Devices>(devices, times));
    }
    hardware::Host asNobody() const {
        return hardware::Host(root_, false, std::make_shared<hardware::Devices>(devices));
    }

    const std::shared_ptr<FakeDevices> devices = std::make_shared<FakeDevices>();

private:
    std::string root_;
};

}  // namespace hardware_test
