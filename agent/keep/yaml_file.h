#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

#include "agent/keep/yaml_line.h"

namespace cvagent::keep {

/// A file of YAML that is changed in few places, as lists of lines and of what they mean. What is not
/// understood of it throws CannotKeep.
class YamlFile {
public:
    explicit YamlFile(const std::string& text);

    const std::vector<std::string>& lines() const { return lines_; }

    /// Where something stands: from its first line to behind its last one.
    struct Span {
        std::size_t first = 0;
        std::size_t end = 0;
    };
    /// A word of a list or a value, and where it stands.
    struct Word {
        std::size_t line = 0;
        std::size_t column = 0;
        std::string text;
    };

    const YamlLine& at(std::size_t line) const { return parsed_[line]; }
    Word valueOf(std::size_t line) const;
    /// @param parent the line of the mapping's key; none for the whole file
    /// @return the key and all below it; nothing when the mapping has none of that name
    std::optional<Span> childOf(const Span& within, std::optional<std::size_t> parent,
                                const std::string& key) const;
    /// The words of a list and its items, without quotes and brackets.
    std::vector<Word> wordsIn(const Span& list) const;
    /// Where the items of a list begin that is no single line.
    std::size_t itemIndent(const Span& list) const;

    [[noreturn]] void refuse(std::size_t line) const { refuseYaml(lines_[line]); }

    void replace(const Word& old, const std::string& value);
    void insert(std::size_t place, const std::vector<std::string>& lines);
    void erase(const Span& span);
    /// The item of a list in which a word stands; a list of nothing else goes as a whole, with its key.
    void eraseItem(const Span& list, const Word& word);

private:
    Span blockAt(std::size_t first, std::size_t limit) const;
    void eraseFromLine(const Span& list, const Word& word);

    std::vector<std::string> lines_;
    std::vector<YamlLine> parsed_;  ///< of the same lines
};

}  // namespace cvagent::keep
