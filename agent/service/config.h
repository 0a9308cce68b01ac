#pragma once

#include <chrono>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace cvagent::service {

inline constexpr const char* kConfigFile = "/etc/corvista/agent.conf";

/// What /etc/corvista/agent.conf says; agent.conf(5) describes it.
struct Config {
    std::chrono::seconds lookEvery{600};          ///< between looks at everything; 0: only at the start
    std::chrono::milliseconds settlingTime{200};  ///< how long it must be quiet before a look
    std::chrono::seconds commandTime{10};         ///< of a plug-in's command; taken at the start
    std::string trustedGroup = "corvista";
    std::chrono::seconds historyAge = std::chrono::hours(24 * 400);  ///< older entries of the history go
    std::uint64_t historyBytes = std::uint64_t{64} << 20U;           ///< of its file
};

/// A file that is read: what it says, and what is wrong with it.
struct ReadConfig {
    Config config;
    std::vector<std::string> complaints;  ///< "line 3: ..." each; with one the whole file is not to be used
};

/// @param text of "key = value" lines; empty ones and those that begin with # say nothing
ReadConfig parseConfig(std::string_view text);
/// A file that is not there says nothing. Throws Problem when it cannot be read or others can write it.
/// @param mustExist it was named by somebody
ReadConfig readConfig(const std::string& file, bool mustExist);

}  // namespace cvagent::service
