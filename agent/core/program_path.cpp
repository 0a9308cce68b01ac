#include "agent/core/program_path.h"

#include <filesystem>

namespace cvagent {

std::optional<std::string> besideProgram(std::initializer_list<const char*> directories, const char* name) {
    std::error_code error;
    const auto program = std::filesystem::read_symlink("/proc/self/exe", error);
    for (const char* directory : directories) {
        const auto place = std::filesystem::canonical(program.parent_path() / directory, error);
        if (!error && std::filesystem::exists(place / name, error)) {
            return (place / name).string();
        }
    }
    return std::nullopt;
}

}  // namespace cvagent
