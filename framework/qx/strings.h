#pragma once

#include <string>

#include "framework/export.h"

namespace QX {

/// UTF-8 to wide text and back, whatever the locale. Bytes that are not UTF-8 survive the round trip
/// unchanged: they stand as U+DC80 to U+DCFF in the wide text. Other wide characters that are no Unicode
/// scalar become U+FFFD.
CORVISTA_API std::wstring make_wstring(const std::string& text);
CORVISTA_API std::string make_string(const std::wstring& text);

}  // namespace QX
