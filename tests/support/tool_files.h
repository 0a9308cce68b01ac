#pragma once

#include <string>
#include <vector>

/// Where the scripted tools and the recorders keep what they answer and what they saw. The tool program
/// itself includes this, so it needs nothing but strings.
namespace fake_host {

inline constexpr const char* toolDirectory = "/tools";
// A place of its own for the program behind the tools: the build may lie below /tmp, which a program under
// test hides.
inline constexpr const char* toolProgramDirectory = "/.fakehost";
inline constexpr const char* answerDirectory = "/tools/.answers";
inline constexpr const char* callsFile = "/record/calls";
inline constexpr const char* failuresFile = "/record/failures";
inline constexpr const char* turnsDirectory = "/record/turns";
inline constexpr const char* clockFile = "/record/clock";
inline constexpr const char* clockErrorFile = "/record/clock.error";
inline constexpr int unrecordedStatus = 97;

/// A word as commands write it: in single quotes when it is empty or holds a blank or a quote.
inline std::string quoteWord(const std::string& word) {
    if (!word.empty() && word.find_first_of(" \t\n'") == std::string::npos) return word;
    std::string quoted = "'";
    for (char c : word) quoted += c == '\'' ? std::string("'\\''") : std::string(1, c);
    return quoted + "'";
}

inline std::string joinWords(const std::vector<std::string>& words) {
    std::string line;
    for (const std::string& word : words) line += (line.empty() ? "" : " ") + quoteWord(word);
    return line;
}

/// A text as a file name: "/", "%" and the line break as %2F, %25 and %0A.
inline std::string fileName(const std::string& text) {
    std::string name;
    for (char c : text) {
        if (c == '/')
            name += "%2F";
        else if (c == '%')
            name += "%25";
        else if (c == '\n')
            name += "%0A";
        else
            name += c;
    }
    return name;
}

/// The text that fileName was given.
inline std::string textOfFileName(const std::string& name) {
    std::string text;
    for (size_t at = 0; at < name.size(); ++at) {
        const std::string code = name.substr(at, 3);
        const char c = code == "%2F" ? '/' : code == "%25" ? '%' : code == "%0A" ? '\n' : '\0';
        text += c ? c : name[at];
        if (c) at += 2;
    }
    return text;
}

/// The name of the answer file for these arguments, in the directory of the tool.
inline std::string answerName(const std::vector<std::string>& arguments) {
    return arguments.empty() ? "%none" : fileName(joinWords(arguments));
}

}  // namespace fake_host
