#include "network/interface_file.h"

#include <fstream>
#include <utility>

#include "mi/command.h"
#include "mi/log.h"
#include "mi/text.h"

namespace IC {

std::string InterfaceFile::pathOf(const std::string& mac) {
    return "/etc/sysconfig/network/ifcfg-eth-id-" + mac;
}

InterfaceFile::InterfaceFile(const std::string& mac) : path_(pathOf(mac)) {
    if (auto file = LineFile::read(path_)) {
        file_ = std::move(*file);
    } else if (std::ifstream(path_).is_open()) {
        isWhole_ = false;
        log(kError) << "Could not read all of '" << path_ << "'.";
    }
}

void InterfaceFile::replace(std::initializer_list<KeyLine*> keys) {
    file_.rewrite([&](std::string& line) {
        for (KeyLine* key : keys) {
            if (!contains(line, key->key)) {
                continue;
            }
            key->seen = true;
            if (key->held == KeyLine::Held::keptUntouched) {
                break;
            }
            if (key->held == KeyLine::Held::replaced) {
                line = key->line;
            }
        }
        return LineFile::Fate::keep;
    });
}

void InterfaceFile::appendMissing(std::initializer_list<const KeyLine*> keys) {
    for (const KeyLine* key : keys) {
        if (!key->seen && !key->line.empty()) {
            file_.append(key->line);
        }
    }
}

std::string InterfaceFile::lastLine() const {
    return file_.lines().empty() ? "" : file_.lines().back();
}

bool InterfaceFile::write(const char* opened) const {
    const auto tell = [&] {
        if (opened != nullptr) {
            log(kChange) << opened;
        }
    };
    return isWhole_ && file_.write(path_, tell);
}

std::optional<std::string> interfaceFileValue(const std::string& ifName, const char* key) {
    return firstLine(
               formatCommand("cat /etc/sysconfig/network/ifcfg-eth-id-`ifconfig %s 2> /dev/null |grep HWaddr "
                             "|awk '{print $5}'|tr '[A-Z]' '[a-z]'` | grep %s | cut -d '=' -f2 2> /dev/null",
                             ifName, key))
        .line;
}

}  // namespace IC
