#include "agent/keep/lost_manager.h"

#include <memory>
#include <utility>

#include "agent/core/text.h"
#include "hosttools/interfaces.h"

namespace cvagent::keep {

namespace {

std::unique_ptr<const LostManager>& only() {
    static std::unique_ptr<const LostManager> lost;
    return lost;
}

}  // namespace

LostManager::LostManager(std::function<void(const std::string&)> tell) : tell_(std::move(tell)) {
    hosttools::Interfaces interfaces;
    if (hosttools::readInterfaces("", interfaces) != 0) {
        return;
    }
    Daemons daemons;
    for (const hosttools::Link& link : interfaces.links) {
        if (auto told = ask(link.name, daemons)) {
            links_[link.name] = *std::move(told);
        }
    }
}

std::optional<LostManager::Told> LostManager::ask(const std::string& link, Daemons& daemons) {
    Told told;
    try {
        const auto found = daemons.networkManagerOn(link);
        if (!found) {
            return std::nullopt;
        }
        told.link = *found;
        if (found->isManaged && !found->isExternal) {
            told.profile = keep::profileOn(link);
        }
    } catch (const NoAnswer& none) {
        told.silence = none.what();
    } catch (const CannotKeep& cannot) {
        told.refusal = cannot.what();
    }
    return told;
}

std::optional<ManagedLink> LostManager::on(const std::string& link) const {
    const auto found = links_.find(link);
    if (found == links_.end()) {
        return std::nullopt;
    }
    if (!found->second.silence.empty()) {
        throw NoAnswer(found->second.silence);
    }
    return found->second.link;
}

ManagerProfile LostManager::profileOn(const std::string& link) const {
    const auto found = links_.find(link);
    if (found == links_.end() || !found->second.profile) {
        const bool isRefused = found != links_.end() && !found->second.refusal.empty();
        throw CannotKeep(isRefused ? found->second.refusal
                                   : "NetworkManager has no connection active on " + inQuotes(link));
    }
    return *found->second.profile;
}

const LostManager* lostManager() {
    return only().get();
}

void loseManager(std::function<void(const std::string&)> tell) {
    only() = std::make_unique<LostManager>(std::move(tell));
}

const std::function<void(const std::string&)>* toldInstead() {
    return lostManager() == nullptr ? nullptr : &lostManager()->tell();
}

}  // namespace cvagent::keep
