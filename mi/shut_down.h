#pragma once

namespace IC {

// What the plug-in leaves behind on the host is removed by the room that made it.

/// Removes the saved settings of every interface (network/).
void deleteSavedConfigurations();
/// Removes the disk snapshot (storage/).
void deleteFdiskTmp();

}  // namespace IC
