#pragma once

#include <chrono>
#include <memory>
#include <mutex>
#include <string>

#include "framework/ic/mutable_node.h"
#include "plugins/hardware/host.h"
#include "plugins/hardware/patience.h"
#include "plugins/hardware/sources.h"

namespace hardware {

/// What all nodes ask with. It lives as long as the last question.
struct Asking {
    explicit Asking(Host where, std::chrono::milliseconds limit = std::chrono::seconds(2))
        : host(std::move(where)), patience(limit) {}

    Host host;
    Patience patience;
};

/// What is known of a thing, and when the asking for it began.
struct Known {
    Found found;
    std::chrono::steady_clock::time_point asOf{};
};

/// What is known of a thing that does not answer.
Found nameOnly(Class type, const std::string& name);

/// Asks one source for things of these names.
/// @return for each what is known; nothing when it does not answer in time
std::vector<std::optional<Known>> ask(const std::shared_ptr<Asking>& asking, const Source& source,
                                      const std::vector<std::string>& names);

/// A node of the tree: stores what was found, and looks again when a live property is read.
class HardwareNode : public IC::MutableNode {
public:
    struct Place {
        unsigned int id;
        unsigned int parent;
        std::vector<unsigned int> owners;
        unsigned int index;
    };
    HardwareNode(const Place& place, const Source& source, std::string name, std::shared_ptr<Asking> asking);

    /// A live property is read from the host, at most twice a second, and every property until the thing has
    /// answered once; Error::unanswered when who knows it does not answer in time.
    IC::Error getProperty(unsigned int id, IC::PropertyValue& out) const override;
    IC::Error getProperties(std::map<unsigned int, IC::PropertyValue>& out) const override;
    /// Nothing of the host is changed here.
    IC::Error setProperty(const unsigned int& id, const IC::PropertyValue& value) override;

    const Source& source() const { return source_; }
    const std::string& name() const { return name_; }
    /// Takes over what was found; what is not told any more is forgotten. What was asked for before what is
    /// known already is old, and changes nothing.
    void store(const Known& known);

private:
    /// Whether the thing has not answered yet that could tell it.
    bool isOpen(Id id) const;
    IC::Error refresh() const;
    void takeOver(const Known& known) const;

    const Source& source_;
    const std::string name_;
    const std::shared_ptr<Asking> asking_;
    mutable std::mutex guard_;  // guards what is known; not held while the host is asked
    mutable Known known_;
};

}  // namespace hardware
