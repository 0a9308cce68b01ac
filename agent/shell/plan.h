#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace cvagent::shell {

struct Pipeline;

/// One word of a command. Where a command stands in backquotes in it, what that one prints goes between the
/// two texts, and the whole is split at blanks as the shell splits it.
struct Word {
    std::string text;
    std::shared_ptr<const Pipeline> inserted;  ///< null in nearly every word
    std::string after;                         ///< behind what is inserted
};

struct Redirection {
    std::string path;
    bool append = false;
};

/// One tool of a pipeline with its words, the tool's name first.
struct Stage {
    std::vector<Word> words;
    std::optional<Redirection> output;
    bool silent = false;  ///< standard error goes to /dev/null
    std::string pattern;  ///< the stage as it was written, if it has a pattern of file names in it
};

struct Pipeline {
    std::vector<Stage> stages;
    std::string text;  ///< as it was written, for a shell that is to run it after all
    /// The text before and behind its one command in backquotes, both empty without one.
    std::string beforeInserted;
    std::string behindInserted;
};

/// A command line of the closed grammar: pipelines that run one after the other.
using Plan = std::vector<Pipeline>;

/// Reads a command line: pipelines divided by `;`, stages by `|`; at the end of the last stage of a pipeline
/// `> FILE` or `>> FILE`, in any stage `2> /dev/null`; words bare, in 'quotes' or in "quotes"; in one word of
/// a pipeline's first stage a pipeline in backquotes; in the words of a first stage with others behind it `*`
/// among bare letters.
/// @return nothing for whatever else a shell would understand: variables, other patterns of file names,
/// conditions, its own words and commands. That is for the shell to run.
std::optional<Plan> readPlan(std::string_view text);

}  // namespace cvagent::shell
