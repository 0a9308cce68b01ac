#include "computer/time_zone.h"

#include <unistd.h>

#include <cstdio>
#include <filesystem>
#include <optional>
#include <string>
#include <system_error>

#include "framework/qx/zone_table.h"
#include "mi/command.h"
#include "mi/line_file.h"
#include "mi/log.h"

namespace IC {

namespace {

constexpr char kClockFile[] = "/etc/sysconfig/clock";
constexpr char kClockCopy[] = "/etc/sysconfig/clock.bak";
constexpr char kLocalTime[] = "/etc/localtime";
constexpr char kOldLocalTime[] = "/etc/localtime.bak";
constexpr char kZoneDirectory[] = "/usr/share/zoneinfo/";

/// Ends every line with a line break and replaces the first one that begins with `key`.
/// @return whether there was one
bool replaceFirst(LineFile& file, const char* key, const std::string& replacement) {
    bool replaced = false;
    file.endLastLine();
    file.rewrite([&](std::string& line) {
        if (!replaced && line.starts_with(key)) {
            line = replacement;
            replaced = true;
        }
        return LineFile::Fate::keep;
    });
    return replaced;
}

/// The copy's lines. A directory in its place has none, and taking that back would empty the clock file.
std::optional<LineFile> readCopy() {
    std::error_code unknown;
    return std::filesystem::is_directory(kClockCopy, unknown) ? std::nullopt : LineFile::read(kClockCopy);
}

/// Writes the changed lines to the copy and the copy back. Each way is left out when a file of its cannot be
/// opened. A copy that is not whole, for want of room, is not taken back.
void rewriteClock(const std::string& timezoneLine) {
    auto written = LineFile::Written::notOpened;
    if (auto clock = LineFile::read(kClockFile)) {
        replaceFirst(*clock, "TIMEZONE", timezoneLine);
        written = clock->replace(kClockCopy);
    }
    const auto copy = readCopy();
    if (copy && written != LineFile::Written::notWhole) {
        copy->write(kClockFile);
    }
    unlink(kClockCopy);
}

/// Whether `cp` came to the end of the disk before it came to the end of the clock file.
bool isCutShort(const LineFile& copy) {
    const auto clock = LineFile::read(kClockFile);
    return clock && clock->text() != copy.text() && clock->text().starts_with(copy.text());
}

bool switchLocalTime(const std::string& zoneFile) {
    static_cast<void>(rename(kLocalTime, kOldLocalTime));  // there may be none
    if (symlink(zoneFile.c_str(), kLocalTime) == 0) {
        return true;
    }
    if (rename(kOldLocalTime, kLocalTime) != 0) {
        log(kError) << "rename /etc/localtime.bak to /etc/localtime failed";
    }
    return false;
}

}  // namespace

bool setTimezone(unsigned int offset) {
    const Operation operation;
    log(kProgress) << "setTimezone: enter";
    const QX::Zone* zone = QX::findZone(offset);
    if (zone == nullptr) {
        return false;
    }
    const std::string zoneFile = std::string(kZoneDirectory) + zone->file;
    log(kProgress) << "tz_file: " << zoneFile;
    log(kProgress) << "tz_string: " << zone->name;
    rewriteClock(std::string("TIMEZONE=\"") + zone->name + "\"\n");
    const bool switched = switchLocalTime(zoneFile);
    log(kProgress) << "setTimezone: exit";
    return switched;
}

bool setAutoDSTEnabled(bool utc) {
    const LogScope scope;
    HostCommand::fromText(textCommand("/bin/cp %s %s", kClockFile, kClockCopy));
    auto copy = readCopy();
    bool replaced = false;
    // Whether cp did its work is not asked: without it, a copy that was left behind becomes the clock file.
    if (copy && !isCutShort(*copy)) {
        replaced = replaceFirst(*copy, "HWCLOCK", utc ? "HWCLOCK=\"-u\"\n" : "HWCLOCK=\"--localtime\"\n");
        replaced &= copy->replace(kClockFile) == LineFile::Written::whole;
    }
    unlink(kClockCopy);
    return replaced;
}

}  // namespace IC
