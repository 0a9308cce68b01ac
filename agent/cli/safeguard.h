#pragma once

#include <optional>
#include <string>
#include <vector>

#include "agent/cli/changes.h"
#include "agent/undo/making.h"

namespace cvagent {

/// How long a change waits for its confirmation: as asked for, or a minute when a person at a terminal could
/// cut himself off; nothing when nobody waits.
std::optional<double> confirmSeconds(const Options& options, const std::vector<change::MeantChange>& changes);

/// Saves what a change touches and, where a confirmation is waited for, has the guard take it back. What
/// cannot be saved is a Failure where a confirmation was asked for, and told otherwise.
class ChangeSafeguard : public change::Safeguard {
public:
    explicit ChangeSafeguard(const Options& options) : options_(options) {}

    void begin(const std::vector<change::MeantChange>& changes,
               const std::vector<change::FileChange>& planned) override;
    void beginStep() override;
    bool end(bool hasFailed) override;

private:
    void open(const std::vector<change::MeantChange>& changes,
              const std::vector<change::FileChange>& planned);
    void tellMade();
    void tellUnwritten(bool hasFailed, const std::string& reason) const;
    bool isTakenBack();

    const Options& options_;
    std::optional<double> seconds_;
    std::optional<undo::ChangeInMaking> making_;
};

/// Sentences on what could not be taken back, each on a line of its own.
std::string notesOf(const undo::Journal& journal);

}  // namespace cvagent
