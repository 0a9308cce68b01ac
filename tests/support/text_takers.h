#pragma once

#include <string>
#include <vector>

/// A function of the plug-in that puts a text into a command: one that it is given, or one that a tool
/// printed.
struct TextTaker {
    const char* name;
    void (*run)(const std::string& text);
    bool writesFiles = false;         ///< for a fake host only
    const char* printedBy = nullptr;  ///< part of the command whose output is the text; none: it is given
    const char* printedBefore = "";   ///< what that command prints in front of it
    const char* loses = "";           ///< the characters that the text loses at both ends first
    const char* passesOver = "";      ///< the characters with which the function leaves a text out by itself

    /// The text as it enters the command.
    std::string entering(const std::string& text) const;
    /// What the commands of this function print, for a shell that is not there.
    std::string answer(const std::string& command, const std::string& text) const;
};

/// All of them, once for each place of a text.
const std::vector<TextTaker>& textTakers();
