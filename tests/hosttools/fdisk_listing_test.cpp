#include "hosttools/fdisk_listing.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <sstream>

#include "tests/hosttools/host_tree.h"
#include "tests/hosttools/process.h"

namespace hosttools {
namespace {

std::string listingOf(const std::string& root) {
    Text text;
    for (const Disk& disk : listDisks(root)) listDisk(text, disk);
    return text.str();
}

std::string joined(const std::vector<std::string>& lines) {
    std::string text;
    for (const std::string& line : lines) text += line + "\n";
    return text;
}

std::vector<std::string> split(const std::string& text) {
    std::vector<std::string> lines;
    std::istringstream in(text);
    for (std::string line; std::getline(in, line);) lines.push_back(line);
    return lines;
}

std::vector<std::string> sorted(std::vector<std::string> lines) {
    std::ranges::sort(lines);
    return lines;
}

/// The recorded hosts: what sysfs and udev say there, and what the listing and lsblk make of it.
class RecordedHost : public testing::TestWithParam<const char*> {
protected:
    const std::string host_ = GetParam();
    HostTree tree_{host_};
    std::string file(const std::string& extension) const { return "hosts/" + host_ + extension; }
    std::string listing() const { return listingOf(tree_.root()); }
    /// Runs a pipeline over the snapshot of the listing, as the drive inventory does.
    std::vector<std::string> snapshot(const std::string& pipeline) {
        tree_.addBytes("tmp/fdisk_tmp", listing());
        return split(shell("cat " + tree_.root() + "/tmp/fdisk_tmp | " + pipeline).output);
    }
};

TEST_P(RecordedHost, ListsItsDisks) {
    expectRecorded(file(".fdisk"), listing());
}

TEST_P(RecordedHost, HasTheRecordedLsblkListing) {
    if (!hasProgram("lsblk")) GTEST_SKIP() << "lsblk is not installed";
    const Outcome lsblk = shell("lsblk --sysroot " + tree_.root() + " -b -n -r -o NAME,TYPE,SIZE");
    expectRecorded(file(".lsblk"), joined(sorted(split(lsblk.output))));
}

/// "name bytes" of every drive, as lsblk says.
std::vector<std::string> drivesOfLsblk(const std::string& text) {
    std::vector<std::string> drives;
    for (const std::string& line : split(text)) {
        std::istringstream words(line);
        std::string name, type, size;
        words >> name >> type >> size;
        const bool drive = name.starts_with("sd") || name.starts_with("hd");
        if (drive && type == "disk" && size != "0") drives.push_back("/dev/" + name + " " + size);
    }
    return drives;
}

TEST_P(RecordedHost, ItsDriveLinesSayWhatLsblkSays) {
    std::vector<std::string> drives;
    for (const std::string& line : snapshot("grep ^Disk")) {
        const std::string quoted = "echo \"" + line + "\" | cut -d \" \" ";
        const std::string device = shell(quoted + "-f2").output;
        if (!device.starts_with("/dev/sd") && !device.starts_with("/dev/hd")) continue;
        const std::string path = device.substr(0, device.find_last_not_of(":\n") + 1);
        drives.push_back(path + " " + split(shell(quoted + "-f5").output).at(0));
    }
    EXPECT_EQ(sorted(drives), drivesOfLsblk(recording(file(".lsblk"))));
}

/// "path blocks" of every partition, as lsblk says.
std::vector<std::string> partitionsOfLsblk(const std::string& text) {
    std::vector<std::string> partitions;
    for (const std::string& line : split(text)) {
        std::istringstream words(line);
        std::string name, type;
        unsigned long long size = 0;
        words >> name >> type >> size;
        if (type == "part") partitions.push_back("/dev/" + name + " " + std::to_string(size / 1024));
    }
    return sorted(partitions);
}

TEST_P(RecordedHost, ItsPartitionLinesSayWhatLsblkSays) {
    std::vector<std::string> partitions;
    for (const std::string& line : snapshot("grep ^/dev")) {
        std::string blocks = shell("echo \"" + line + "\" |  tr -s '*' ' '  | cut -d ' ' -f4").output;
        blocks.erase(blocks.find_last_not_of("+\n") + 1);
        partitions.push_back(line.substr(0, line.find(' ')) + " " + blocks);
    }
    EXPECT_EQ(sorted(partitions), partitionsOfLsblk(recording(file(".lsblk"))));
}

INSTANTIATE_TEST_SUITE_P(Hosts, RecordedHost,
                         testing::Values("bare", "dos_logical", "gpt", "large", "many", "raid_mapper",
                                         "removable", "sector_4096", "virtual"),
                         [](const auto& host) { return host.param; });

std::string diskLine(std::uint64_t bytes) {
    Disk disk;
    disk.name = "sda";
    disk.sectors = bytes / 512;
    Text text;
    listDisk(text, disk);
    return split(text.str()).at(1);
}

TEST(FdiskListing, SizesInMegabytesAndGigabytes) {
    EXPECT_EQ(diskLine(80026361856), "Disk /dev/sda: 80.0 GB, 80026361856 bytes");
    EXPECT_EQ(diskLine(512), "Disk /dev/sda: 0 MB, 512 bytes");
    EXPECT_EQ(diskLine(9999999488), "Disk /dev/sda: 9999 MB, 9999999488 bytes");
    EXPECT_EQ(diskLine(10000000000), "Disk /dev/sda: 10.0 GB, 10000000000 bytes");
    EXPECT_EQ(diskLine(10049999872), "Disk /dev/sda: 10.0 GB, 10049999872 bytes");
    EXPECT_EQ(diskLine(10050000384), "Disk /dev/sda: 10.1 GB, 10050000384 bytes");
    EXPECT_EQ(diskLine(18000207937536), "Disk /dev/sda: 18000.2 GB, 18000207937536 bytes");
}

TEST(FdiskListing, ADiskWithAnEmptyTableHasTheHeadingOnly) {
    Disk disk;
    disk.name = "sda";
    disk.scheme = PartitionScheme::dos;
    Text text;
    listDisk(text, disk);
    EXPECT_TRUE(text.str().ends_with("\n\n   Device Boot      Start         End      Blocks   Id  System\n"));
    EXPECT_FALSE(isBare(disk));
}

TEST(FdiskListing, TheMessageAboutAMissingTable) {
    Disk disk;
    disk.name = "sdb";
    EXPECT_TRUE(isBare(disk));
    EXPECT_EQ(missingTableMessage(disk).str(), "Disk /dev/sdb doesn't contain a valid partition table\n");
}

}  // namespace
}  // namespace hosttools
