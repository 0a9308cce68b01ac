// The link states of the last pass, kept across restarts of the agent: one key an interface, its state in
// decimal.
#include <climits>
#include <optional>
#include <stdexcept>

#include "framework/qx/corvista_utilities.h"
#include "framework/qx/property_file.h"
#include "framework/qx/strings.h"
#include "indications/globals.h"
#include "indications/network_monitor.h"
#include "mi/text.h"

namespace IC {

namespace {

/// The data directory's text carries its slash.
std::string stateFilePath() {
    const char* directory = QX::CorvistaUtilities::getMoraineDataDir();
    if (directory == nullptr) {
        logInd(kNoAnswer) << "NULL returned by CorvistaUtilities::getMoraineDataDir()";
        throw std::runtime_error("no data directory");
    }
    return std::string(directory) + "oshwminetind.dat";
}

/// Digits alone, as they were written; nothing for a line that was damaged.
std::optional<unsigned int> keptState(const std::string& text) {
    const bool digits = text.find_first_not_of("0123456789") == text.npos && !text.empty();
    const long long number = digits ? leadingDecimal(text) : -1;
    return number >= 0 && number <= UINT_MAX ? std::optional(static_cast<unsigned int>(number))
                                             : std::nullopt;
}

}  // namespace

void writePrevNetNodeMap(const Pass& pass) {
    const LogScope scope("writePrevNetNodeMap", indicationsLogSource);
    try {
        QX::PropertyFile file{QX::File::Path(stateFilePath())};
        file.open(QX::PropertyFile::forWriting);
        // The keys of interfaces that have gone stay: one that comes back is compared with what it was.
        for (const auto& [name, state] : pass.now.current) {
            file.setValue(QX::make_wstring(name), std::to_wstring(state));
        }
        file.close();
    } catch (...) {
        logInd(kError) << "OSHWMI_NET_IND_DAT_FILE: Exception in writing file";
    }
}

void readPrevNetNodeMap(Pass& pass) {
    const LogScope scope("readPrevNetNodeMap", indicationsLogSource);
    pass.previous.clear();
    try {
        QX::PropertyFile file{QX::File::Path(stateFilePath())};
        file.open(QX::PropertyFile::forReading);
        for (const std::wstring& key : file.enumerateKeys()) {
            if (const auto state = keptState(QX::make_string(file.getValue(key)))) {
                pass.previous[QX::make_string(key)] = *state;
            }
        }
        file.close();
        OSHWMI_IND::datFileAvailable = true;
    } catch (...) {
        // The first start of all has no file: an empty map raises no alert.
        logInd(kProgress) << "OSHWMI_NET_IND_DAT_FILE: Not available";
        pass.previous.clear();
        OSHWMI_IND::datFileAvailable = false;
    }
}

}  // namespace IC
