// The link states of the last pass, kept across restarts of the agent: one key an interface, its state in
// decimal.
#include <charconv>
#include <optional>
#include <stdexcept>

#include "framework/qx/corvista_utilities.h"
#include "framework/qx/property_file.h"
#include "framework/qx/strings.h"
#include "indications/globals.h"
#include "indications/pass.h"

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

std::optional<unsigned int> decimal(const std::string& text) {
    unsigned int number = 0;
    const char* end = text.data() + text.size();
    const auto [stopped, failure] = std::from_chars(text.data(), end, number);
    return failure == std::errc() && stopped == end ? std::optional(number) : std::nullopt;
}

}  // namespace

void writePrevNetNodeMap(const Pass& pass) {
    const LogScope scope("writePrevNetNodeMap", indicationsLogSource);
    try {
        QX::PropertyFile file{QX::File::Path(stateFilePath())};
        file.open(QX::PropertyFile::forWriting);
        // What is not visited stays: an interface that comes back is compared with what it was.
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
            if (const auto state = decimal(QX::make_string(file.getValue(key)))) {
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
