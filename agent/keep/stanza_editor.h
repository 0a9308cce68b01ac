#pragma once

#include <string>

#include "agent/keep/wish.h"

namespace cvagent::keep {

/// A file of ifupdown's with as few lines changed as the wish takes: those of the one stanza of the interface
/// and family. Lines that nobody asked about stay byte for byte.
/// @param name of the logical interface
/// Throws CannotKeep: there is no such stanza or there are several, parts of it stand elsewhere, what is
/// asked for does not go with its method, or no prefix length is known.
std::string editedStanza(const std::string& text, const std::string& name, const Wish& wish);

}  // namespace cvagent::keep
