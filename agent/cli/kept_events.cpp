#include "agent/cli/kept_events.h"

#include <unistd.h>

#include <optional>

#include "agent/cli/print.h"
#include "agent/history/recorder.h"

namespace cvagent {

namespace {

constexpr std::size_t kMostUnseen = 1000;

/// Whatever goes wrong with it is told once, and then nobody knows what was shown.
class LocalMarks : public ShownMarks {
public:
    Unseen unseen() override {
        Unseen found;
        use([&found](History& history) {
            History::Unseen unseen = history.unseen(geteuid(), kMostUnseen);
            found.left = unseen.left;
            for (HistoryEntry& entry : unseen.entries) {
                found.events.push_back(std::move(entry.event));
            }
        });
        return found;
    }
    void shown(std::uint64_t number) override {
        use([number](History& history) { history.shown(geteuid(), number); });
    }

private:
    template <class Work>
    void use(Work work) {
        try {
            if (!broken_ && exists()) {
                work(*history_);
            }
        } catch (const HistoryError& error) {
            broken_ = true;
            complain(std::string("what was shown before is not known: ") + error.what());
        }
    }
    /// It is not made for this.
    bool exists() {
        if (!history_) {
            const HistoryPlace place = ownHistoryPlace();
            if (access(place.file().c_str(), F_OK) == 0) {
                history_.emplace(place, complain);
            }
        }
        return history_.has_value();
    }

    std::optional<History> history_;
    bool broken_ = false;
};

}  // namespace

std::shared_ptr<EventKeeper> eventKeeper() {
    return std::make_shared<Recorder>(ownHistoryPlace, complain);
}

std::shared_ptr<ShownMarks> shownMarks() {
    return std::make_shared<LocalMarks>();
}

}  // namespace cvagent
