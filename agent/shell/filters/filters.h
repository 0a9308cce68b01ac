#pragma once

#include <memory>
#include <span>
#include <string>

#include "agent/shell/source.h"

namespace cvagent::shell {

/// The words behind a tool's name.
using Words = std::span<const std::string>;

/// How a tool is called, and which one it is.
struct Manner {
    bool silent = false;   ///< the stage's complaints are wanted by nobody
    bool busybox = false;  ///< busybox's own tool, which differs where a zero stands in a text
};

/// Each makes the filter that does what the tool of that name does with these words, in the C locale: byte
/// for byte what the tool prints, and its exit status. Null where the words hold anything that the filter
/// does not know; then the tool itself has to run. None of them opens a file.
std::unique_ptr<Filter> makeCat(Words words, Manner manner);
std::unique_ptr<Filter> makeGrep(Words words, Manner manner);
std::unique_ptr<Filter> makeEgrep(Words words, Manner manner);
/// The same with the name by which a complaint calls what is searched.
enum class Dialect { basic, extended };
std::unique_ptr<Filter> makeGrepOf(const std::string& name, Words words, Dialect dialect, Manner manner);
std::unique_ptr<Filter> makeCut(Words words, Manner manner);
std::unique_ptr<Filter> makeTr(Words words, Manner manner);
std::unique_ptr<Filter> makeAwk(Words words, Manner manner);
std::unique_ptr<Filter> makeMd5sum(Words words, Manner manner);
std::unique_ptr<Filter> makeSha1sum(Words words, Manner manner);

}  // namespace cvagent::shell
