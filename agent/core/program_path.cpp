#include "agent/core/program_path.h"

#include <filesystem>

namespace cvagent {

std::string programDirectory() {
    std::error_code error;
    return std::filesystem::read_symlink("/proc/self/exe", error).parent_path();
}

std::optional<std::string> besideProgram(std::initializer_list<const char*> directories, const char* name) {
    const std::filesystem::path program = programDirectory();
    if (program.empty()) {
        return std::nullopt;  // what follows would be meant from the current directory
    }
    std::error_code error;
    for (const char* directory : directories) {
        const auto place = std::filesystem::canonical(program / directory, error);
        if (!error && std::filesystem::exists(place / name, error)) {
            return (place / name).string();
        }
    }
    return std::nullopt;
}

}  // namespace cvagent
