#pragma once

#include <string>

#include "framework/export.h"

namespace QX {

/// UTF-8 to wide text and back. Bytes that are not UTF-8 survive the round trip unchanged.
CORVISTA_API std::wstring make_wstring(const std::string& text);
CORVISTA_API std::string make_string(const std::wstring& text);

}  // namespace QX
