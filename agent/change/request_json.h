#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "agent/change/change.h"
#include "agent/change/plan.h"
#include "agent/core/host_tools.h"

/// What rehearse() and its program say to each other.
namespace cvagent::change {

/// What the program is to try.
struct RehearsalRequest {
    std::vector<std::string> plugins;
    std::string dataDirectory;
    HostTools hostTools = HostTools::automatic;
    Commands commands = Commands::direct;
    std::vector<Change> changes;
};

std::string toJson(const RehearsalRequest& request);
/// Throws BadPlan.
RehearsalRequest requestFromJson(std::string_view json);

/// The plan, or why there is none.
struct RehearsalAnswer {
    std::string cannot;  ///< "": there is a plan
    Plan plan;
};

std::string answerOf(const Plan& plan);
std::string answerOf(const std::string& cannot);
/// Throws BadPlan.
RehearsalAnswer answerFromJson(std::string_view json);

}  // namespace cvagent::change
