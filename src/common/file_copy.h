#pragma once

#include <string>

namespace mirevo {

/// Copies what is left between the two files' offsets, by the cheapest way that the file systems know. False, with the
/// reason in errno, when that fails.
bool copyContent(int from, int to);

/// Copies a regular file, its mode and its times to `target`, which is the whole copy as soon as it is there: it is
/// written beside it, as `target` with ".part" behind, and renamed. False, with the system's reason, when that fails;
/// it names the target where that, and not the source, is at fault.
bool copyWhole(const std::string& source, const std::string& target, std::string& reason);

/// Puts a file back that somebody removed while it was open, with all that was written to it; `descriptor`, opened for
/// reading, too, then stands for the new one, at its end. Nothing happens to a file that is there. False, with the
/// reason in errno, when that fails; EEXIST where another file has taken its place.
bool putBackIfRemoved(int descriptor, const std::string& path);

}  // namespace mirevo
