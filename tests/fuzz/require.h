#pragma once

#include <cstdlib>

/// Ends the program where the promise is not kept, which the fuzzer takes for a crash.
inline void require(bool promise) {
  if (!promise) std::abort();
}
