#include "network/interface_file.h"

#include "mi/command.h"
#include "mi/text.h"

namespace IC {

InterfaceFile::InterfaceFile(const std::string& mac)
    : path_("/etc/sysconfig/network/ifcfg-eth-id-" + mac),
      file_(LineFile::read(path_).value_or(LineFile())) {}

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

std::optional<std::string> interfaceFileValue(const std::string& ifName, const char* key) {
    return firstLine(
               formatCommand("cat /etc/sysconfig/network/ifcfg-eth-id-`ifconfig %s 2> /dev/null |grep HWaddr "
                             "|awk '{print $5}'|tr '[A-Z]' '[a-z]'` | grep %s | cut -d '=' -f2 2> /dev/null",
                             ifName.c_str(), key))
        .line;
}

}  // namespace IC
