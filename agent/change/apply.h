#pragma once

#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "agent/change/outcome.h"
#include "agent/change/proposal.h"

namespace cvagent::change {

/// Stands by while changes are made, so that they can be taken back. Each call may throw Problem; then no
/// further write follows.
class Safeguard {
public:
    Safeguard() = default;
    Safeguard(const Safeguard&) = delete;
    Safeguard& operator=(const Safeguard&) = delete;
    virtual ~Safeguard() = default;

    /// Nothing is written yet.
    /// @param changes that will be, in their order
    /// @param planned the files that they touch where they were tried out; none where they were not
    virtual void begin(const std::vector<MeantChange>& changes, const std::vector<FileChange>& planned) = 0;
    virtual void beginStep() = 0;
    /// @param hasFailed the last step has, and those behind it are not made
    /// @return whether all of it is taken back
    virtual bool end(bool hasFailed) = 0;
};

struct ApplySettings {
    RehearsalSettings rehearsal;
    bool triesOut = true;  ///< as a plan does; what would fail there keeps all back
    bool force = false;    ///< although something speaks against it, or it fails when it is tried out
    /// How long to look at what was written; nothing: not at all, and the write's own word counts.
    std::optional<double> verifySeconds = kVerifySeconds;
    /// For each write; the plan is for the record.
    std::function<Request(const std::string& plan)> request;
    /// What a person should know besides. Printable.
    std::function<void(const std::string& text)> tell;
    /// Asked before the first write and between two looks; null: always.
    std::function<bool()> goesOn;
    Safeguard* safeguard = nullptr;  ///< null: nobody stands by
};

/// Makes the changes that are to be made. The first that fails is the last. Throws Problem, and nothing is
/// done then: refused or failed with Problem::objection where force would do it, busy when it was not to go
/// on before anything was written.
/// @return one for each change of the list
std::vector<Outcome> apply(ChangedHost& host, const Proposal& proposal, const ApplySettings& settings);

}  // namespace cvagent::change
