#include "agent/core/host_file.h"

#include <filesystem>
#include <fstream>
#include <iterator>
#include <system_error>

namespace cvagent {

std::optional<std::string> contentOf(const std::string& path) {
    std::error_code unknown;
    std::ifstream file;
    if (std::filesystem::is_regular_file(path, unknown)) {
        file.open(path);
    }
    if (!file.is_open()) {
        return std::nullopt;
    }
    return std::string(std::istreambuf_iterator<char>(file), {});
}

}  // namespace cvagent
