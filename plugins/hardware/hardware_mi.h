#pragma once

#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <utility>

#include "framework/ic/management_interface.h"
#include "plugins/hardware/hardware_node.h"
#include "plugins/hardware/watcher.h"

namespace hardware {

/// The plug-in: the tree of what the kernel tells of the hardware, kept current by the kernel's own news.
class HardwareMI : public IC::ManagementInterface {
public:
    /// @param host where to look; tests give a recorded one
    explicit HardwareMI(Host host);
    ~HardwareMI() override;

    IC::Error initialize(unsigned int miId, const IC::Number& ownNodeId,
                         const IC::Number& firstNodeId) override;
    IC::Error unload() override;

    /// Compares what there is with the tree: new things appear, gone ones go, the others are asked again.
    /// @param subsystem only what kernel news of that kind concern; "" for everything
    void lookAgain(const std::string& subsystem);

private:
    using Key = std::pair<Class, std::string>;
    enum class Moment { start, later };

    void look(const Source& source, Moment moment);
    void withdrawGone(const Source& source);
    void place(const Source& source, const Known& known, Moment moment);
    unsigned int parentOf(const Found& found) const;

    const Host host_;
    std::mutex guard_;  // one look at a time; guards what follows
    std::shared_ptr<Asking> asking_;
    std::map<Key, HardwareNode*> nodes_;  // owned by the base
    std::map<Class, unsigned int> count_;
    std::unique_ptr<Watcher> watcher_;
};

}  // namespace hardware
