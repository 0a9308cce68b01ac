#include <cstdlib>
#include <mutex>
#include <set>
#include <string>

#include "framework/qx/corvista_utilities.h"

namespace QX {
namespace {

/// Keeps every text ever handed out: callers hold the pointer for good.
const char* keep(const std::string& directory) {
    static auto* const guard = new std::mutex;
    static auto* const kept = new std::set<std::string>;
    const std::lock_guard lock(*guard);
    return kept->insert(directory).first->c_str();
}

}  // namespace

const char* CorvistaUtilities::getMoraineDataDir() {
    const char* const chosen = std::getenv("CORVISTA_DATA_DIR");
    if (chosen == nullptr) {
        return "/opt/vantrel/corvista/data/";
    }
    std::string directory = chosen;
    if (directory.empty()) {
        return nullptr;
    }
    if (directory.back() != '/') {
        directory += '/';
    }
    return keep(directory);
}

}  // namespace QX
