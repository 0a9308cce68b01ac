#include "framework/ic/conversion_error.h"

namespace IC {

// Here, so that the exception has one type information for the agent and the plug-in.
ConversionError::~ConversionError() = default;

}  // namespace IC
