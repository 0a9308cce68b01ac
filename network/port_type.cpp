#include "network/port_type.h"

#include <strings.h>

#include "mi/log.h"

namespace IC {

namespace {

struct PortType {
    const char* text;
    unsigned int code;
};

// 102 is left out on purpose: "1000Base-SX" has never had a code and readers take its 0 for "unknown".
constexpr PortType kPortTypes[] = {
    {"10BaseT", 50},     {"10-100BaseT", 51},  {"100BaseT", 52},           {"1000BaseT", 53},
    {"2500BaseT", 54},   {"10GBaseT", 55},     {"10GBase-CX4", 56},        {"100Base-FX", 100},
    {"100Base-SX", 101}, {"1000Base-LX", 103}, {"1000Base-CX", 104},       {"10GBase-SR", 105},
    {"10GBase-SW", 106}, {"10GBase-LX4", 107}, {"10GBase-LR", 108},        {"10GBase-LW", 109},
    {"10GBase-ER", 110}, {"10GBase-EW", 111},  {"Vendor Reserved", 16000}, {"Other", 1},
};

}  // namespace

unsigned int getPortType(const char* text) {
    const LogScope scope;
    for (const PortType& type : kPortTypes) {
        if (strcasecmp(text, type.text) == 0) {
            return type.code;
        }
    }
    return 0;
}

}  // namespace IC
