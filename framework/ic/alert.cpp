#include "framework/ic/alert.h"

namespace IC {

Alert::Alert(unsigned char firstCode, unsigned char secondCode, std::vector<std::string> substitutions,
             unsigned int nodeId, std::string message)
    : firstCode_(firstCode),
      secondCode_(secondCode),
      substitutions_(std::move(substitutions)),
      nodeId_(nodeId),
      message_(std::move(message)) {}

}  // namespace IC
