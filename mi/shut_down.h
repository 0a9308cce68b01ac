#pragma once

namespace IC {

/// Removes the saved settings of every interface. Implemented in network/, whose files they are.
void deleteSavedConfigurations();

}  // namespace IC
