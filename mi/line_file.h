#pragma once

#include <functional>
#include <optional>
#include <string>
#include <vector>

namespace IC {

/// A text file of the host that is read whole, changed line by line and written back whole. Every writer of
/// the plug-in is a rule for one line and the lines it appends; whatever the rule does not touch stays byte
/// for byte.
class LineFile {
public:
    /// What becomes of a line.
    enum class Fate { keep, drop };

    LineFile() = default;  ///< no lines
    /// The lines of a file, however long. Nothing when it cannot be opened for reading, or not be read to its
    /// end, for rewriting it would then lose the rest. A directory has no lines; writing to it fails.
    static std::optional<LineFile> read(const std::string& path);

    /// Calls `rule(std::string& line)` for every line in order. The line carries its line break, which the
    /// last line of a file may lack; the rule may change the line and says whether it stays.
    template <class Rule>
    void rewrite(Rule rule) {
        std::vector<std::string> kept;
        for (std::string& line : lines_) {
            if (rule(line) == Fate::keep) {
                kept.push_back(std::move(line));
            }
        }
        lines_ = std::move(kept);
    }

    /// Gives the last line a line break when it lacks one.
    void endLastLine();
    /// Adds a line (with its line break) at the end; a last line without a line break gets one first.
    void append(const std::string& line);
    /// Adds a line (with its line break) at the start.
    void prepend(const std::string& line);
    void clear() { lines_.clear(); }
    const std::vector<std::string>& lines() const { return lines_; }
    /// All lines in one, as they stand in the file.
    std::string text() const;

    /// What became of a file that was to be written.
    enum class Written { notOpened, notWhole, whole };

    /// Replaces the content of the file, created when it is missing. A full disk is noticed before the old
    /// content goes; where the file system cannot tell, a failed write leaves the file with a part of the new
    /// content. Both are logged at level 6000.
    /// @param opened called once the file is open for writing, before anything is written
    Written replace(const std::string& path, const std::function<void()>& opened = {}) const;
    /// The same for writers that go on either way.
    /// @return whether the file could be opened for writing
    bool write(const std::string& path, const std::function<void()>& opened = {}) const {
        return replace(path, opened) != Written::notOpened;
    }

private:
    std::vector<std::string> lines_;
};

}  // namespace IC
