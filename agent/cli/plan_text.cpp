#include "agent/cli/plan_text.h"

#include <algorithm>
#include <array>

#include "agent/change/kernel_state.h"
#include "agent/change/unified_diff.h"

namespace cvagent {

namespace {

using change::FileChange;
using change::FileState;

std::string headed(const Style& style, const std::string& title, const std::string& body) {
    return body.empty() ? "" : style.strong(title) + "\n" + body + "\n";
}

std::string answerText(const change::Answer& answer, const Style& style) {
    std::string text = "  " + printable(answer.node) + "  " + printable(answer.property) + "\n";
    const auto line = [&text](const char* what, const std::string& value) {
        text += "    " + std::string(what) + "  " + (value.empty() ? "(empty)" : printable(value)) + "\n";
    };
    if (answer.problem.empty()) {
        line("old", answer.before);
        line("new", answer.after);
    } else {
        text += "    " + style.bad(printable(answer.problem)) + "\n";
    }
    for (const std::string& error : answer.errors) {
        text += "    the plug-in reports: " + printable(error) + "\n";
    }
    return text + (answer.lacking.empty() ? "" : "    " + style.bad(printable(answer.lacking)) + "\n");
}

std::string octal(mode_t mode) {
    constexpr unsigned kDigits = 4;
    constexpr unsigned kBits = 3;
    std::string digits(kDigits, '0');
    for (unsigned i = 0; i < kDigits; ++i) {
        digits[kDigits - 1 - i] = static_cast<char>('0' + ((mode >> (kBits * i)) & 7U));
    }
    return digits;
}

/// What a file is besides its content.
std::string kindOf(const std::optional<FileState>& state) {
    static constexpr std::array kKinds = {"file", "link", "directory", "other"};
    if (!state) {
        return "none";
    }
    const std::string kind = kKinds.at(static_cast<std::size_t>(state->type));
    return state->type == FileState::Type::link
               ? kind + " to " + printable(state->content)
               : kind + ", mode " + octal(state->mode) + ", owner " + std::to_string(state->owner) + ":" +
                     std::to_string(state->group);
}

bool isFile(const std::optional<FileState>& state) {
    return state && state->type == FileState::Type::file;
}

std::string contentOf(const std::optional<FileState>& state) {
    return isFile(state) ? state->content : "";
}

std::string coloured(const std::string& diff, const Style& style) {
    std::string text;
    for (std::size_t at = 0; at < diff.size();) {
        const std::size_t end = std::min(diff.find('\n', at), diff.size());
        const std::string line = diff.substr(at, end - at);
        text += (line.starts_with('+')   ? style.good(line)
                 : line.starts_with('-') ? style.bad(line)
                                         : line) +
                "\n";
        at = end + 1;
    }
    return text;
}

std::string fileText(const FileChange& file, const Style& style) {
    const std::string name = printable(file.path);
    std::string text;
    if (kindOf(file.before) != kindOf(file.after)) {
        text = "    " + kindOf(file.before) + " becomes " + kindOf(file.after) + "\n";
    }
    text += "--- " + (file.before ? name : "/dev/null") + "\n+++ " + (file.after ? name : "/dev/null") + "\n";
    const bool isWithheld = (file.before && file.before->withheld) || (file.after && file.after->withheld);
    return text + (isWithheld
                       ? "    its content is not told\n"
                       : coloured(change::unifiedDiff(contentOf(file.before), contentOf(file.after)), style));
}

std::string commandsText(const std::vector<change::PlannedCommand>& commands) {
    std::string text;
    for (std::size_t i = 0; i < commands.size(); ++i) {
        const std::string number = std::to_string(i + 1);
        text += std::string(number.size() < 4 ? 4 - number.size() : 0, ' ') + number + "  " +
                printable(commands[i].text) + (commands[i].recorded ? "  (not tried)" : "") + "\n";
    }
    return text;
}

/// Those lines that come and go, and where none does, that.
std::string kernelText(const change::Plan& plan, const Style& style) {
    std::string text;
    for (const std::string& line : change::missingFrom(plan.kernelAfter, plan.kernelBefore)) {
        text += style.bad("- " + printable(line)) + "\n";
    }
    for (const std::string& line : change::missingFrom(plan.kernelBefore, plan.kernelAfter)) {
        text += style.good("+ " + printable(line)) + "\n";
    }
    return text.empty() ? "  as before\n" : text;
}

}  // namespace

std::string planText(const change::Plan& plan, const Style& style) {
    std::string answers;
    for (const change::Answer& answer : plan.answers) {
        answers += answerText(answer, style);
    }
    std::string files;
    for (const FileChange& file : plan.files) {
        files += fileText(file, style);
    }
    std::string unforeseen;
    for (const std::string& sentence : plan.unforeseen) {
        unforeseen += "  " + printable(sentence) + "\n";
    }
    return headed(style, "CHANGES", answers) +
           headed(style, "FILES", files.empty() ? "  as before\n" : files) +
           headed(style, "COMMANDS", commandsText(plan.commands)) +
           headed(style, "KERNEL AFTERWARDS", kernelText(plan, style)) +
           headed(style, "NOT TO BE FORESEEN", unforeseen);
}

}  // namespace cvagent
