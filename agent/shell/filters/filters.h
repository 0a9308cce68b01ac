#pragma once

#include <memory>
#include <span>
#include <string>

#include "agent/shell/source.h"

namespace cvagent::shell {

/// The words behind a tool's name.
using Words = std::span<const std::string>;

/// Each makes the filter that does what the tool of that name does with these words, in the C locale: byte
/// for byte what the tool prints, and its exit status. Null where the words hold anything that the filter
/// does not know; then the tool itself has to run. None of them opens a file.
/// @param silent whether the stage's complaints are wanted by nobody
std::unique_ptr<Filter> makeCat(Words words, bool silent);
std::unique_ptr<Filter> makeGrep(Words words, bool silent);
std::unique_ptr<Filter> makeEgrep(Words words, bool silent);
/// The same with the name by which a complaint calls what is searched.
enum class Dialect { basic, extended };
std::unique_ptr<Filter> makeGrepOf(const std::string& name, Words words, Dialect dialect, bool silent);
std::unique_ptr<Filter> makeCut(Words words, bool silent);
std::unique_ptr<Filter> makeTr(Words words, bool silent);
std::unique_ptr<Filter> makeAwk(Words words, bool silent);
std::unique_ptr<Filter> makeMd5sum(Words words, bool silent);
std::unique_ptr<Filter> makeSha1sum(Words words, bool silent);

}  // namespace cvagent::shell
