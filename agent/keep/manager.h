#pragma once

#include <functional>
#include <string>

#include "agent/keep/profile.h"

namespace cvagent::keep {

/// The connection profile that NetworkManager has active on a link, and keeps in a file of its own.
struct ManagerProfile {
    std::string id;  ///< its name, for people
    std::string file;
    ProfileIp ip;

    bool operator==(const ManagerProfile&) const = default;
};

/// Throws CannotKeep where there is none that could be kept otherwise, NoAnswer.
ManagerProfile profileOn(const std::string& link);

/// Has NetworkManager write the profile with other addresses, and bring it into force. Nothing else of it may
/// become another one, secrets included. Throws CannotKeep when it is not the one that was looked at any
/// more, when NetworkManager refuses, and when something else has changed with it.
void updateProfile(const std::string& link, const ManagerProfile& before, const ProfileIp& wanted);

/// Has it read the file of the profile again and bring that into force. Throws CannotKeep.
void rereadProfile(const std::string& link);

/// For a process that is about to lose the system's bus: what NetworkManager tells of all links is asked now
/// and told from then on, and what it would be asked to do is only handed over, in words.
void loseManager(std::function<void(const std::string&)> tell);

/// Who is told what would be asked of it; null where it is asked.
const std::function<void(const std::string&)>* toldInstead();

}  // namespace cvagent::keep
