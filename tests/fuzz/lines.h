#pragma once

#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>

#include "mi/command.h"

namespace fuzz {

/// Ends the run when a parser's answer is not what was agreed.
#define AGREED(condition)                                                                \
    do {                                                                                 \
        if (!(condition)) {                                                              \
            std::fprintf(stderr, "%s:%d: not so: %s\n", __FILE__, __LINE__, #condition); \
            std::abort();                                                                \
        }                                                                                \
    } while (false)

/// Gives the input to a parser line by line, as it would come through a command's line buffer: at most 511
/// characters, the line break included, up to the first zero byte.
template <class Parser>
void eachLine(const std::uint8_t* data, std::size_t size, Parser parser) {
    const std::string text(reinterpret_cast<const char*>(data), size);
    for (std::size_t start = 0; start < text.size();) {
        const std::size_t lineBreak = text.find('\n', start);
        const std::size_t end = lineBreak == text.npos ? text.size() : lineBreak + 1;
        const std::string line = text.substr(start, std::min(end - start, IC::kCommandBuffer - 1));
        parser(std::string(line.c_str()));
        start += line.size();
    }
}

}  // namespace fuzz
