#include <algorithm>
#include <array>
#include <optional>
#include <utility>

#include "plugins/hardware/bytes.h"
#include "plugins/hardware/storage/health.h"

// ATA commands travel in ATA PASS-THROUGH (16) of SCSI (SAT). The layouts are those of ACS-3.
namespace hardware {

namespace {

constexpr std::size_t kBlock = 512;

struct AtaCommand {
    std::uint8_t command;
    std::uint8_t features = 0;
    std::uint8_t low = 0;
    std::uint16_t middle = 0;  ///< LBA 8 to 23; with 48 bits the page number in its lower half
    bool reads = false;        ///< one block; else the registers tell the answer
    bool extended = false;
};

constexpr std::uint16_t kSmartSignature = 0xc24f;
constexpr AtaCommand kCheckPowerMode{0xe5};
constexpr AtaCommand kSmartData{0xb0, 0xd0, 0, kSmartSignature, true};
constexpr AtaCommand kSmartStatus{0xb0, 0xda, 0, kSmartSignature};
constexpr AtaCommand kIdentify{0xec, 0, 0, 0, true};
constexpr AtaCommand kLogDirectory{0x2f, 0, 0, 0, true, true};
constexpr AtaCommand kSolidStatePage{0x2f, 0, 4, 7, true, true};

std::optional<ScsiAnswer> send(const DeviceAccess& access, const DeviceFile& drive,
                               const AtaCommand& command) {
    constexpr unsigned int kNoData = 3U << 1U;
    constexpr unsigned int kPioIn = 4U << 1U;
    constexpr unsigned int kTellRegisters = 0x20;
    constexpr unsigned int kOneBlockIn = 0x0e;
    std::vector<std::uint8_t> bytes(16);
    bytes[0] = 0x85;
    bytes[1] = static_cast<std::uint8_t>((command.reads ? kPioIn : kNoData) | (command.extended ? 1U : 0U));
    bytes[2] = static_cast<std::uint8_t>(command.reads ? kOneBlockIn : kTellRegisters);
    bytes[4] = command.features;
    bytes[6] = command.reads ? 1 : 0;
    bytes[8] = command.low;
    bytes[10] = static_cast<std::uint8_t>(command.middle & 0xffU);
    bytes[12] = static_cast<std::uint8_t>(command.middle >> 8U);
    bytes[14] = command.command;
    return access.scsi(drive, bytes, command.reads ? kBlock : 0);
}

/// One whole block; empty when the drive gives none.
std::string read(const DeviceAccess& access, const DeviceFile& drive, const AtaCommand& command) {
    const auto answer = send(access, drive, command);
    return answer && answer->data.size() == kBlock ? answer->data : "";
}

struct Registers {
    std::uint8_t count;
    std::uint8_t middle;
    std::uint8_t high;
};

/// The drive's registers in the sense data, in either of their formats.
std::optional<Registers> registersIn(const std::string& sense) {
    constexpr std::size_t kHead = 8;
    const unsigned int format = byteAt(sense, 0) & 0x7fU;
    if (format == 0x72 && byteAt(sense, kHead) == 0x09 && sense.size() >= kHead + 14) {
        return Registers{byteAt(sense, kHead + 5), byteAt(sense, kHead + 9), byteAt(sense, kHead + 11)};
    }
    if (format == 0x70 && byteAt(sense, 12) == 0 &&
        byteAt(sense, 13) == 0x1d) {  // "ATA information available"
        return Registers{byteAt(sense, 6), byteAt(sense, 10), byteAt(sense, 11)};
    }
    return std::nullopt;
}

std::optional<Registers> tell(const DeviceAccess& access, const DeviceFile& drive,
                              const AtaCommand& command) {
    const auto answer = send(access, drive, command);
    return answer ? registersIn(answer->sense) : std::nullopt;
}

/// What CHECK POWER MODE tells; nothing for what nobody has defined.
std::optional<std::string> powerState(std::uint8_t count) {
    using State = std::pair<std::uint8_t, const char*>;
    static constexpr std::array<State, 9> kStates = {{{0x00, "standby"},
                                                      {0x01, "standby"},
                                                      {0x40, "standby"},
                                                      {0x41, "active"},
                                                      {0x80, "idle"},
                                                      {0x81, "idle"},
                                                      {0x82, "idle"},
                                                      {0x83, "idle"},
                                                      {0xff, "active"}}};
    const auto* const known = std::ranges::find(kStates, count, &State::first);
    return known == kStates.end() ? std::nullopt : std::optional<std::string>(known->second);
}

/// Some drives send nothing or zeros: the sum over all bytes is 0 in a block that is one.
bool isSound(const std::string& block) {
    unsigned int sum = 0;
    for (const char byte : block) {
        sum += static_cast<unsigned char>(byte);
    }
    return !block.empty() && (sum & 0xffU) == 0 && block.find_first_not_of('\0') != std::string::npos;
}

/// The raw value of an attribute: 6 bytes.
std::optional<std::uint64_t> attribute(const std::string& data, std::uint8_t id) {
    constexpr std::size_t kFirst = 2;
    constexpr std::size_t kCount = 30;
    constexpr std::size_t kLength = 12;
    for (std::size_t at = 0; at < kCount; ++at) {
        if (byteAt(data, kFirst + at * kLength) == id) {
            return littleEndian(data, kFirst + at * kLength + 5, 6);
        }
    }
    return std::nullopt;
}

void addSmartData(const std::string& data, Health& health) {
    if (!isSound(data)) {
        return;
    }
    if (const auto hours = attribute(data, 9)) {
        health.hours = *hours & 0xffffffU;  // many makers count something else above
    }
    const auto inside = attribute(data, 194);
    const auto temperature = inside ? inside : attribute(data, 190);
    if (temperature && (*temperature & 0xffU) != 0) {
        health.temperature = static_cast<std::int8_t>(*temperature & 0xffU);  // above: the least and the most
    }
}

/// The last words of a statistic tell whether it is supported and valid.
void addSolidStatePage(const std::string& page, Health& health) {
    constexpr std::size_t kEndurance = 8;
    constexpr unsigned int kSupportedAndValid = 0xc0;
    const bool isPage = byteAt(page, 2) == 7;
    if (isPage && (byteAt(page, kEndurance + 7) & kSupportedAndValid) == kSupportedAndValid) {
        health.worn = byteAt(page, kEndurance);
    }
}

void addSmart(const DeviceAccess& access, const DeviceFile& drive, Health& health) {
    addSmartData(read(access, drive, kSmartData), health);
    const auto status = tell(access, drive, kSmartStatus);
    if (status && status->middle == 0xf4 && status->high == 0x2c) {
        health.warnings.emplace_back("failure predicted");
    }
}

bool bitOfWord(const std::string& identity, std::size_t word, unsigned int bit) {
    return (littleEndian(identity, word * 2, 2) >> bit & 1U) != 0;
}

}  // namespace

Health askAta(const DeviceAccess& access, const DeviceFile& drive) {
    constexpr std::size_t kDeviceStatistics = 4;
    constexpr std::size_t kRotationWord = 217;
    Health health;
    const auto mode = tell(access, drive, kCheckPowerMode);
    health.power = mode ? powerState(mode->count) : std::nullopt;
    if (!health.power || health.power == "standby") {
        return health;
    }
    const std::string identity = read(access, drive, kIdentify);
    if (bitOfWord(identity, 82, 0) && bitOfWord(identity, 85, 0)) {  // SMART: there and switched on
        addSmart(access, drive, health);
    }
    const bool solid = littleEndian(identity, kRotationWord * 2, 2) == 1;
    if (solid && bitOfWord(identity, 84, 5)) {  // logs
        const std::string logs = read(access, drive, kLogDirectory);
        if (littleEndian(logs, kDeviceStatistics * 2, 2) > 7) {
            addSolidStatePage(read(access, drive, kSolidStatePage), health);
        }
    }
    return health;
}

}  // namespace hardware
