#pragma once

#include <sys/types.h>

#include <memory>
#include <string>

#include "agent/shell/pipeline_run.h"
#include "agent/shell/plan.h"

namespace cvagent::shell {

/// One command line, run without a shell as far as it is of the closed grammar. What it does happens on the
/// calling thread, when somebody reads or waits; only its tools run beside it. Nothing is thrown: a fault
/// ends the command.
class Command {
public:
    /// @param standardOutput where its tools print; -1: it is read
    Command(std::string text, int standardOutput);

    /// Starts its first tool, and before that does what comes before it.
    /// @return refused: nothing was done, and a shell is to run it
    Outcome begin() noexcept;
    /// Has a shell run all of it.
    Outcome beginInShell() noexcept;
    /// The next bytes of its output. Waits until there are some.
    /// @return how many; 0 at the end
    ssize_t read(char* buffer, std::size_t size) noexcept;
    /// Lets it come to its end.
    /// @return as waitpid tells it of a shell
    int finish() noexcept;

private:
    bool hasMore() const { return next_ < plan_.size(); }
    Outcome startNext();
    bool startFurther();
    void endCurrent(bool unread);

    std::string text_;
    int standardOutput_;
    Plan plan_;
    std::size_t next_ = 0;
    std::unique_ptr<PipelineRun> current_;
    std::string pending_;
    bool ended_ = false;  ///< its output was read to the end
    bool killed_ = false;
    bool inShell_ = false;
    int status_ = 0;
    int waited_ = 0;  ///< of the last process, as waitpid tells it
};

}  // namespace cvagent::shell
