#pragma once

#include <string>
#include <vector>

/// How a program ended that had a terminal as its input and output.
struct OnTerminal {
    int status;  ///< its exit status, or 128 and the signal that killed it
    std::string output;
};

/// Runs a program on a terminal of its own, with a data directory of its own. To be called on the fake host.
/// @param typed what is typed right away
OnTerminal runOnTerminal(const std::vector<std::string>& words, const std::string& typed);

/// The same, but nothing is typed: a signal is sent once the program has printed a text.
OnTerminal stopOnTerminal(const std::vector<std::string>& words, const std::string& awaited, int signal);

/// Runs a program as a user without rights, whose home is `home`. Output and errors come together.
OnTerminal runAsNobody(const std::vector<std::string>& words, const std::string& home);
/// Makes a directory that belongs to that user.
void makeForNobody(const std::string& directory);
