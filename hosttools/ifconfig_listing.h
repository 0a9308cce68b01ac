#pragma once

#include <cstdint>

#include "hosttools/interfaces.h"
#include "hosttools/text.h"

namespace hosttools {

/// One interface in the classic format, with the blank line behind it.
void listInterface(Text& text, const Stanza& stanza);

/// A number of bytes as people read it, "(1.2 KiB)" without the parentheses: a decimal cut off, not rounded.
void addScaledBytes(Text& text, std::uint64_t bytes);

}  // namespace hosttools
