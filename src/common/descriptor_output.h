#pragma once

#include <cstddef>
#include <string_view>

namespace mirevo {

struct OutputResult {
  std::size_t taken = 0;  ///< bytes written
  int error = 0;          ///< 0: all was written; EAGAIN: the reader accepted nothing in time; else the system's error
};

inline constexpr int kAsLongAsItTakes = -1;

/// Writes `text` with write(2). Each time a terminal or pipe accepts nothing (a stopped terminal, a pager that nobody
/// scrolls), it waits for at most `patienceMilliseconds`. It never waits for files on disk.
OutputResult writeWhole(int descriptor, std::string_view text, int patienceMilliseconds = kAsLongAsItTakes);

}  // namespace mirevo
