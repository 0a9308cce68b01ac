#pragma once

#include <string>

namespace cvagent {

/// Takes down who has started the program, as far as its environment tells. To be called before that goes.
void rememberCaller();

/// Who writes, for the record: "anna (uid 1000) as root (uid 0)", or only the user that the program runs as.
/// Behind "as" stands that user, in front the one who had logged in: as the kernel knows, else as sudo told.
std::string callerName();

}  // namespace cvagent
