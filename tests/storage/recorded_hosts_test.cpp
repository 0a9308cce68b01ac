// Recorded hosts: the nodes built from what the host-tool adapter lists there say what lsblk says.
#include <algorithm>
#include <fstream>
#include <limits>
#include <sstream>

#include "mi/disk_snapshot.h"
#include "oshwmi/os_hw_mi.h"
#include "tests/storage/storage_host.h"

namespace {

std::string recordingPath(const std::string& name) {
    return testsDirectory() + "/hosttools/hosts/" + name;
}

struct Device {
    std::string path;
    unsigned long long size;

    friend auto operator<=>(const Device&, const Device&) = default;
    friend std::ostream& operator<<(std::ostream& out, const Device& device) {
        return out << device.path << " " << device.size;
    }
};

/// The devices of `lsblk -b` in the units of the nodes.
struct Expected {
    std::vector<Device> drives;
    std::vector<Device> partitions;

    explicit Expected(const std::string& host) {
        std::ifstream lines(recordingPath(host + ".lsblk"));
        EXPECT_TRUE(lines) << host;
        std::string name;
        std::string type;
        for (unsigned long long bytes = 0; lines >> name >> type >> bytes;) {
            const bool drive = name.starts_with("sd") || name.starts_with("hd");
            if (type == "disk" && drive && bytes != 0) {
                drives.push_back({"/dev/" + name, bytes / 1000});
            } else if (type == "part") {
                partitions.push_back({"/dev/" + name, asLong(bytes / 1024)});
            }
        }
        std::ranges::sort(drives);
        std::ranges::sort(partitions);
    }

    /// What a block count becomes where a `long` has 32 bits.
    static unsigned long long asLong(unsigned long long blocks) {
        constexpr unsigned long long largest = std::numeric_limits<long>::max();
        return std::min(blocks, largest);
    }
};

std::vector<Device> sorted(const std::vector<Seen>& nodes) {
    std::vector<Device> devices;
    for (const Seen& node : nodes) {
        devices.push_back({node.path, node.size});
    }
    std::ranges::sort(devices);
    return devices;
}

class RecordedHosts : public StorageHost {};

HOST_TEST_F(RecordedHosts, HaveTheDrivesAndPartitionsOfLsblk) {
    std::size_t devices = 0;
    for (const char* name : {"bare", "dos_logical", "gpt", "large", "many", "raid_mapper", "removable",
                             "sector_4096", "virtual"}) {
        host.file(IC::diskSnapshotPath, host.read(recordingPath(std::string(name) + ".fdisk")).value());
        IC::myoshwmi.createHardDriveNodes(true);
        IC::myoshwmi.createPartitionNodes(true);
        const Expected expected(name);
        EXPECT_EQ(sorted(drives()), expected.drives) << name;
        EXPECT_EQ(sorted(partitions()), expected.partitions) << name;
        devices += expected.drives.size() + expected.partitions.size();
    }
    EXPECT_GT(devices, 30U) << "the recordings were read";
}

}  // namespace
