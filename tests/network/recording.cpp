#include "tests/network/recording.h"

#include <fstream>
#include <sstream>
#include <stdexcept>

#include "tests/support/fake_host.h"

std::string recording(const std::string& name) {
    std::ifstream in(testsDirectory() + "/network/recorded/" + name, std::ios::binary);
    if (!in) {
        throw std::runtime_error("no such recording: " + name);
    }
    std::ostringstream text;
    text << in.rdbuf();
    return text.str();
}
