#pragma once

#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "agent/change/outcome.h"
#include "agent/change/proposal.h"

namespace cvagent::change {

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
};

/// Makes the changes that are to be made. The first that fails is the last. Throws Problem, and nothing is
/// done then: refused or failed with Problem::objection where force would do it, busy when it was not to go
/// on before anything was written.
/// @return one for each change of the list
std::vector<Outcome> apply(ChangedHost& host, const Proposal& proposal, const ApplySettings& settings);

}  // namespace cvagent::change
