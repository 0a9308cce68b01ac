#pragma once

#include <dlfcn.h>

namespace hardware {

/// Looks a function up in a library that is only loaded when it is needed.
/// @param library null when there is none
/// @return whether it is there
template <class Function>
bool findFunction(void* library, const char* name, Function& function) {
    function = library == nullptr ? nullptr : reinterpret_cast<Function>(dlsym(library, name));
    return function != nullptr;
}

}  // namespace hardware
