#include "agent/core/program_path.h"

#include <filesystem>

namespace cvagent {

/// Below another root (chroot) the kernel tells the way from the host's own as soon as the process has left
/// the mounts that it was started in.
std::string programDirectory() {
    std::error_code error;
    static const std::string atFirst = std::filesystem::read_symlink("/proc/self/exe", error).parent_path();
    return atFirst;
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
