#pragma once

#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

#include "agent/core/host_tools.h"
#include "agent/service/config.h"

namespace cvagent::service {

/// What the command line asks for.
struct Options {
    bool check = false;  ///< only read the configuration and say what is wrong
    std::string config = kConfigFile;
    bool configNamed = false;
    std::string bus = "system";  ///< or an address
    bool privateBus = false;
    std::string runDirectory;             ///< of the private bus; "" for the standard one
    std::vector<std::string> plugins;     ///< none: those beside the program
    std::vector<std::string> catalogues;  ///< beside them; not typed
    HostTools hostTools = HostTools::automatic;
    Commands commands = Commands::direct;
};

/// Nothing when help or version was asked for and told. Throws UsageError.
std::optional<Options> parseOptions(int count, const char* const* words);

class UsageError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

}  // namespace cvagent::service
