#include "mi/line_file.h"

#include <fstream>

#include "mi/log.h"

namespace IC {

bool LineFile::isTooLong(const std::string& line) {
    const std::size_t length = line.ends_with('\n') ? line.size() - 1 : line.size();
    return length > longestLine;
}

std::optional<LineFile> LineFile::read(const std::string& path) {
    std::ifstream in(path);
    if (!in) {
        return std::nullopt;
    }
    LineFile file;
    for (std::string line; std::getline(in, line);) {
        file.lines_.push_back(in.eof() ? line : line + '\n');
    }
    return file;
}

void LineFile::append(const std::string& line) {
    if (!lines_.empty() && !lines_.back().ends_with('\n')) {
        lines_.back() += '\n';
    }
    lines_.push_back(line);
}

void LineFile::prepend(const std::string& line) {
    lines_.insert(lines_.begin(), line);
}

bool LineFile::write(const std::string& path) const {
    std::ofstream out(path, std::ios::trunc);
    if (!out) {
        return false;
    }
    for (const std::string& line : lines_) {
        out << line;
    }
    out.close();
    if (!out) {
        log(kError) << "Could not write all of '" << path << "'.";
    }
    return true;
}

}  // namespace IC
