#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "agent/change/apply.h"
#include "agent/undo/making.h"

namespace cvagent::change {

struct RevocableSettings {
    std::string caller;             ///< who makes the change, for people
    std::optional<double> seconds;  ///< for the confirmation; nothing: nobody waits for one
    /// Whether it is made all the same, and that told, when it cannot be taken back.
    bool madeUnguarded = true;
    /// Whether what was made before a step that fails stays; taken back when a confirmation is waited for.
    bool keepsHalf = false;
    std::uint64_t settling = 0;  ///< see undo::Journal
    /// What a person should know. Printable.
    std::function<void(const std::string& text)> tell;
    /// Called before this process takes it back itself; null: nothing is to be done then.
    std::function<void()> beforeTakingBack = nullptr;
};

/// Saves what a change touches and, where a confirmation is waited for, has the guard take it back. Of what
/// nothing takes back, and in a process that is not root's, nothing is saved. Its problems are printable.
class Revocable : public Safeguard {
public:
    explicit Revocable(RevocableSettings settings)
        : settings_(std::move(settings)), seconds_(settings_.seconds) {}

    void begin(const std::vector<MeantChange>& changes, const std::vector<FileChange>& planned) override;
    void beginStep() override;
    bool end(bool hasFailed) override;

private:
    void open(const std::vector<MeantChange>& changes, const std::vector<FileChange>& planned);
    void giveUp(const std::string& reason);
    void tellMade();
    void tellUnwritten(bool hasFailed, const std::string& reason);
    bool isTakenBack();

    RevocableSettings settings_;
    std::optional<double> seconds_;  // nothing as well once nobody guards it
    std::optional<undo::ChangeInMaking> making_;
};

/// One write by itself, which can be taken back later.
/// @param settings nobody waits for a confirmation
WriteResult writeRevocably(ChangedHost& host, const MeantChange& change, const Request& request,
                           RevocableSettings settings);

/// Sentences on what could not be taken back, each on a line of its own, behind a line break.
std::string notesOf(const std::vector<std::string>& notes);

}  // namespace cvagent::change
