#pragma once

#include <string>
#include <vector>

#include "framework/export.h"

namespace IC {

/// An indication for the agent: two codes, the texts to substitute (node paths), the event code that the
/// receiver goes by, and a message for people. A plain value.
class CORVISTA_API Alert {
public:
    Alert(unsigned char firstCode, unsigned char secondCode, std::vector<std::string> substitutions,
          unsigned int eventCode, std::string message);

    unsigned char firstCode() const { return firstCode_; }
    unsigned char secondCode() const { return secondCode_; }
    const std::vector<std::string>& substitutions() const { return substitutions_; }
    unsigned int eventCode() const { return eventCode_; }
    const std::string& message() const { return message_; }

private:
    unsigned char firstCode_;
    unsigned char secondCode_;
    std::vector<std::string> substitutions_;
    unsigned int eventCode_;
    std::string message_;
};

}  // namespace IC
