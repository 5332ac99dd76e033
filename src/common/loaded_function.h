#pragma once

#include <dlfcn.h>

namespace mirevo {

/// The function of that C name in any library that this process has loaded, null if none has it: for what a library
/// that is used through another one, or only at times, says of itself.
template <class Function>
Function* loadedFunction(const char* name) {
  return reinterpret_cast<Function*>(::dlsym(RTLD_DEFAULT, name));
}

}  // namespace mirevo
