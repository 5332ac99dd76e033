#pragma once

#include <cstddef>
#include <string_view>

namespace mirevo {

/// How far a text got that was written to a descriptor.
struct OutputResult {
  std::size_t taken = 0;  ///< bytes
  int error = 0;          ///< 0: all of it; EAGAIN: whoever reads took nothing in time; else the system's reason
};

inline constexpr int kAsLongAsItTakes = -1;

/// Writes `text` with write(2). It waits at most `patienceMilliseconds` each time a terminal or pipe takes nothing: a
/// terminal that is stopped, a pager that nobody scrolls. Files on disk are never waited for.
OutputResult writeWhole(int descriptor, std::string_view text, int patienceMilliseconds = kAsLongAsItTakes);

}  // namespace mirevo
