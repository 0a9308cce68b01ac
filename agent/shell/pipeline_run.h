#pragma once

#include <memory>
#include <string>
#include <vector>

#include "agent/shell/first_stage.h"
#include "agent/shell/plan.h"

namespace cvagent::shell {

/// One pipeline of a command, running. Its first stage may be a process; all behind it are filters. Where
/// another stage would have to be a process, too, a shell runs it: whoever ends a command finds one process.
class PipelineRun {
public:
    /// @param command the whole command line, for whoever asks what a process was started for
    /// @param standardOutput where a process writes whose output nobody reads here; -1: it is read here
    PipelineRun(std::string command, int standardOutput)
        : command_(std::move(command)), standardOutput_(standardOutput) {}

    /// Starts its first tool.
    /// @param pipeline outlives this object
    Outcome start(const Pipeline& pipeline);
    /// Has a shell run it.
    Outcome startInShell(const Pipeline& pipeline);

    /// Appends the next bytes that it prints, as Source does.
    bool pull(std::string& out);
    /// Whether its output goes to a file and no process is needed for it.
    bool isDoneAtOnce() const { return file_.isOpen() && process_ == nullptr && inner_ == nullptr; }
    /// Lets it come to its end.
    /// @param unread nobody reads any more: it is told so by SIGPIPE, as soon as it would print
    Child::End finish(bool unread);

private:
    Outcome makeFilters(ProgramSearch& programs);
    Outcome openOutput();
    Outcome startFirst(std::vector<std::string> words, ProgramSearch& programs);
    Outcome startPattern(const Stage& stage, ProgramSearch& programs);
    Outcome take(FirstStage first);
    bool resolve();
    void substitute(const std::string& printed);
    void drainIntoFile();
    bool drainUnread();
    void failToWrite(int error);

    std::string command_;
    int standardOutput_;
    const Pipeline* pipeline_ = nullptr;
    std::vector<std::unique_ptr<Filter>> filters_;  ///< until the first stage runs
    std::unique_ptr<PipelineRun> inner_;            ///< the one in backquotes, until it has ended
    std::unique_ptr<Source> last_;
    ProcessSource* process_ = nullptr;
    bool filtered_ = false;
    hosttools::Descriptor file_;
    int writeStatus_ = 0;
    Child::End innerEnd_;
};

}  // namespace cvagent::shell
