#include "framework/ic/alert.h"

namespace IC {

Alert::Alert(unsigned char firstCode, unsigned char secondCode, std::vector<std::string> substitutions,
             unsigned int eventCode, std::string message)
    : firstCode_(firstCode),
      secondCode_(secondCode),
      substitutions_(std::move(substitutions)),
      eventCode_(eventCode),
      message_(std::move(message)) {}

}  // namespace IC
