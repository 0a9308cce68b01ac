#include "plugins/hardware/storage/device_access.h"

#include <fcntl.h>
#include <linux/nvme_ioctl.h>
#include <scsi/sg.h>
#include <sys/ioctl.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <sys/sysmacros.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <limits>

#include "plugins/hardware/storage/own_devices.h"

namespace hardware {

namespace {

// The kernel resets what does not answer in its time, and others on the same bus with it. So the time is as
// long as that of its own commands; nobody here waits for it.
constexpr unsigned int kKernelMilliseconds = 30'000;

std::optional<unsigned long long> product(unsigned long long blocks, unsigned long long size) {
    const bool fits = size == 0 || blocks <= std::numeric_limits<unsigned long long>::max() / size;
    return fits ? std::optional(blocks * size) : std::nullopt;
}

}  // namespace

OpenDevice::OpenDevice(const DeviceFile& device)
    // Without O_NONBLOCK a drive without a medium would be waited for, and a tape would be rewound.
    : descriptor_(open(device.path.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC | O_NOCTTY | O_NOFOLLOW)) {
    struct stat found {};
    const bool isBlock = device.sort == DeviceFile::Sort::block;
    const bool right =
        descriptor_ >= 0 && fstat(descriptor_, &found) == 0 &&
        (isBlock ? S_ISBLK(found.st_mode) : S_ISCHR(found.st_mode)) &&
        std::to_string(major(found.st_rdev)) + ":" + std::to_string(minor(found.st_rdev)) == device.number;
    if (descriptor_ >= 0 && !right) {
        close(descriptor_);
        descriptor_ = -1;
    }
}

OpenDevice::~OpenDevice() {
    if (descriptor_ >= 0) {
        close(descriptor_);
    }
}

std::optional<std::string> OwnDevices::nvmeLog(const DeviceFile& controller, unsigned int page,
                                               std::size_t size) const {
    constexpr std::uint8_t kGetLogPage = 0x02;
    constexpr std::uint32_t kWholeController = 0xffffffff;
    const OpenDevice device(controller);
    std::string data(size, '\0');
    nvme_admin_cmd command{};
    command.opcode = kGetLogPage;
    command.nsid = kWholeController;
    command.addr = reinterpret_cast<std::uintptr_t>(data.data());
    command.data_len = static_cast<std::uint32_t>(size);
    command.cdw10 = (static_cast<std::uint32_t>(size / 4) - 1) << 16U | page;
    command.timeout_ms = kKernelMilliseconds;
    const bool told = device.isOpen() && ioctl(device.descriptor(), NVME_IOCTL_ADMIN_CMD, &command) == 0;
    return told ? std::optional(data) : std::nullopt;
}

std::optional<ScsiAnswer> OwnDevices::scsi(const DeviceFile& drive, const std::vector<std::uint8_t>& command,
                                           std::size_t size) const {
    const OpenDevice device(drive);
    std::vector<std::uint8_t> words = command;
    std::array<unsigned char, 64> sense{};
    ScsiAnswer answer{std::string(size, '\0'), ""};
    sg_io_hdr_t request{};
    request.interface_id = 'S';
    request.dxfer_direction = size == 0 ? SG_DXFER_NONE : SG_DXFER_FROM_DEV;
    request.cmdp = words.data();
    request.cmd_len = static_cast<unsigned char>(words.size());
    request.dxferp = answer.data.data();
    request.dxfer_len = static_cast<unsigned int>(size);
    request.sbp = sense.data();
    request.mx_sb_len = static_cast<unsigned char>(sense.size());
    request.timeout = kKernelMilliseconds;
    if (!device.isOpen() || ioctl(device.descriptor(), SG_IO, &request) != 0 || request.host_status != 0) {
        return std::nullopt;
    }
    const bool failed = request.status != 0;
    const std::size_t missing = failed ? size : static_cast<std::size_t>(std::max(request.resid, 0));
    answer.data.resize(size - std::min(missing, size));
    answer.sense.assign(sense.begin(),
                        sense.begin() + std::min<std::size_t>(request.sb_len_wr, sense.size()));
    return answer;
}

std::optional<Room> OwnDevices::room(const std::string& where) const {
    struct statvfs found {};
    if (statvfs(where.c_str(), &found) != 0 || found.f_blocks == 0) {
        return std::nullopt;
    }
    Room room{product(found.f_blocks, found.f_frsize), std::nullopt};
    if (found.f_bavail <= found.f_blocks) {  // some count below zero when root has used what is kept for it
        room.free = product(found.f_bavail, found.f_frsize);
    }
    return room;
}

DeviceAccess::Contents OwnDevices::contents(const DeviceFile& device) const {
    const OpenDevice open(device);
    return open.isOpen() ? probe(open.descriptor()) : Contents();
}

Neighbours OwnDevices::neighbours() const {
    return askNeighbours();
}

std::shared_ptr<const DeviceAccess> ownDevices() {
    return std::make_shared<OwnDevices>();
}

}  // namespace hardware
