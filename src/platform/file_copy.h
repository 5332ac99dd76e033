#pragma once

#include <string>

namespace mirevo {

/// Copies what is left between the two files' offsets, by the cheapest way that the file systems know. False, with the
/// reason in errno, when that fails.
bool copyContent(int from, int to);

/// Copies a regular file, its mode and its times to `target`, which is the whole copy as soon as it is there: it is
/// written beside it, as `target` with ".part" behind, and renamed. False, with the system's reason, when that fails.
bool copyWhole(const std::string& source, const std::string& target, std::string& reason);

}  // namespace mirevo
