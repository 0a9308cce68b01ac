#pragma once

#include <cerrno>
#include <string>
#include <system_error>

namespace fake_host {

/// Passes a result on; throws with errno's text when it is -1.
template <typename Result>
Result must(Result result, const std::string& what) {
    if (result == static_cast<Result>(-1)) throw std::system_error(errno, std::generic_category(), what);
    return result;
}

}  // namespace fake_host
