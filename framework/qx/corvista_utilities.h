#pragma once

#include "framework/export.h"

namespace QX {

class CORVISTA_API CorvistaUtilities {
public:
    /// The agent's data directory, with the slash at its end: CORVISTA_DATA_DIR when that is set, else
    /// "/opt/vantrel/corvista/data/"; null when the variable is set to nothing. The text stays good for ever.
    static const char* getMoraineDataDir();
};

}  // namespace QX
