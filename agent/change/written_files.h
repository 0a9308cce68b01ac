#pragma once

#include <map>
#include <string>
#include <vector>

#include "agent/change/covers.h"
#include "agent/change/plan.h"

namespace cvagent::change {

struct SeenFile {
    FileState state;
    std::string stamp;  ///< of a content that is not told: another one when that is another

    bool operator==(const SeenFile&) const = default;
};

/// What covered places have that the host has not, by path; nothing stands for what is gone there.
using WrittenFiles = std::map<std::string, std::optional<SeenFile>>;

/// What was written so far into the covered places.
WrittenFiles writtenFiles(const std::vector<Cover>& covers);

/// What came between two looks. What is again as it was is left out, and so is what lies in the agent's own
/// /tmp.
/// @param dataDirectory told even there
std::vector<FileChange> changesBetween(const WrittenFiles& before, const WrittenFiles& after,
                                       const std::vector<Cover>& covers, const std::string& dataDirectory);

}  // namespace cvagent::change
