// Rebuilds while the agent reads: nobody crashes, and every node that is read is whole.
#include <atomic>
#include <cstdlib>
#include <thread>

#include "mi/disk_snapshot.h"
#include "mi/node_types.h"
#include "oshwmi/os_hw_mi.h"
#include "tests/storage/storage_host.h"

namespace {

/// CORVISTA_STRESS multiplies the work; read before a fake host cleans the environment.
unsigned factor() {
    const char* text = std::getenv("CORVISTA_STRESS");
    return text != nullptr ? static_cast<unsigned>(std::atoi(text)) : 1;
}
const unsigned kRebuilds = 2000 * factor();

/// Stands in for the shell: answers as the tools would over one of two layouts, without a process.
class CannedLayout {
public:
    CannedLayout() {
        forgetCommands();
        shell_stub::answerWith([this](const std::string& command) { return answer(command); });
    }
    CannedLayout(const CannedLayout&) = delete;
    CannedLayout& operator=(const CannedLayout&) = delete;
    ~CannedLayout() { shell_stub::answerWith({}); }

    void change() { second_ = !second_; }

private:
    std::optional<std::string> answer(const std::string& command) const {
        if (command.find("grep ^Disk") != std::string::npos) {
            return second_ ? "Disk a2 x x 2000\nDisk b3 x x 3000\nDisk c4 x x 4000\n" : "Disk a2 x x 2000\n";
        }
        if (command.find("grep ^/dev") != std::string::npos) {
            return second_ ? "/dev/sda2 5\n" : "/dev/sda3 5\n/dev/sda4 5\n";
        }
        // One digit of the line tells device and size apart: "Disk b3 …" is /dev/sdb3 with 3 thousand bytes.
        const std::string digit(1, command[command.find_first_of("234")]);
        if (command.find("-f2") != std::string::npos) {
            return "/dev/sd" + digit + ":\n";
        }
        return command.find("-f5") != std::string::npos ? digit + "000\n" : digit + "+\n";
    }
    std::atomic<bool> second_{false};
};

/// Reads everything of a drive or partition; its path ends in its size.
bool isWhole(const IC::MutableNode& node) {
    const bool drive = node.nodeType() == IC::NodeType::hardDrive;
    if (!drive && node.nodeType() != IC::NodeType::partition) {
        return true;
    }
    IC::PropertyValue path;
    IC::PropertyValue size;
    IC::PropertyValue health;
    if (node.getProperty(89, path).getStatus() != 0 ||
        node.getProperty(drive ? 37 : 112, size).getStatus() != 0 ||
        node.getProperty(123, health).getStatus() != 0 || size.asNumber() == nullptr) {
        return false;
    }
    return std::string(path).back() == size.asNumber()->toString().back() && node.getStatus() == 1 &&
           node.getDescription() == (drive ? "Hard Drive" : "Partition");
}

class RebuildStress : public StorageHost {};

HOST_TEST_F(RebuildStress, EightReadersNeverSeeANodeThatIsNotWhole) {
    CannedLayout layout;
    host.file(IC::diskSnapshotPath, "");
    std::atomic<bool> over{false};
    std::atomic<unsigned> torn{0};
    std::atomic<unsigned long> reads{0};
    std::vector<std::thread> readers;
    for (int i = 0; i < 8; ++i) {
        readers.emplace_back([&] {
            while (!over) {
                unsigned int last = 0;
                for (const auto& node : IC::myoshwmi.holdAll()) {
                    torn += isWhole(*node) ? 0 : 1;
                    last = node->getNodeId();
                    ++reads;
                }
                if (const auto node = IC::myoshwmi.hold(last)) {
                    torn += isWhole(*node) ? 0 : 1;
                    node->setProperty(200, IC::PropertyValue("label", true));
                }
            }
        });
    }
    for (unsigned i = 0; i < kRebuilds; ++i) {
        layout.change();
        IC::myoshwmi.createHardDriveNodes(true);
        IC::myoshwmi.createPartitionNodes(true);
        diary().clear();
    }
    over = true;
    for (std::thread& reader : readers) {
        reader.join();
    }
    EXPECT_EQ(torn, 0U);
    EXPECT_GT(reads, kRebuilds);
    EXPECT_EQ(drives().size(), 1U);
    EXPECT_EQ(partitions().size(), 2U);
}

HOST_TEST_F(RebuildStress, TheMonitorAndReadersOnAHostWithRealTools) {
    QX::setClockSpeed(1e6);
    const std::string disk = "Disk /dev/sd2: 80.0 GB, 2000 bytes\n";
    host.toolInTurn("fdisk -ls", {{.out = disk},
                                  {.out = disk + "/dev/sda3 1 2 3 83 Linux\n"},
                                  {.out = ""},
                                  {.out = disk},
                                  {.out = disk + "/dev/sda4 1 2 4 83 Linux\n"}});
    std::atomic<bool> over{false};
    std::atomic<unsigned> torn{0};
    std::thread reader([&] {
        while (!over) {
            for (const auto& node : IC::myoshwmi.holdAll()) {
                torn += isWhole(*node) ? 0 : 1;
            }
        }
    });
    IC::myoshwmi.startHDDThread();
    while (host.callsOf("fdisk").size() < 7) {
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }
    IC::OsHwMITestAccess::stopMonitor();
    over = true;
    reader.join();
    EXPECT_EQ(torn, 0U);
    EXPECT_EQ(drives().size(), 1U);
    EXPECT_THAT(partitions(), testing::ElementsAre(testing::Field(&Seen::path, "/dev/sda4")));
}

}  // namespace
