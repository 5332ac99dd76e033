#pragma once

#include <climits>

namespace mirevo {

/// Closes the descriptors from `first` to `last`; makes only async-signal-safe calls.
void closeDescriptors(int first, int last = INT_MAX);

}  // namespace mirevo
