#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <string_view>
#include <sys/stat.h>
#include <vector>

namespace mirevo {

/// By which a file is known to be the same, with the same content: whatever writes to it, replaces it or changes its
/// mode or owner gives it another time of change, which no program can set.
struct FileState {
  std::uint64_t device = 0;
  std::uint64_t inode = 0;
  std::int64_t size = 0;
  std::int64_t modified = 0;  ///< nanoseconds since 1970
  std::int64_t changed = 0;   ///< of the content or what is known of the file (st_ctim), nanoseconds since 1970

  bool operator==(const FileState&) const = default;
};
FileState stateOf(const struct stat& status);

/// Nanoseconds since 1970 on the clock by which local file systems set times.
std::int64_t fileClock();

/// Whether the times of files in `folder` can be relied upon: a local file system that notes every change, also by
/// mmap(), when it happens, and whose clock is this machine's. Not so tmpfs, network file systems, and those not known.
bool hasReliableTimes(const std::string& folder);

/// What of a folder is copied.
struct FolderListing {
  struct Entry {
    std::string path;  ///< below the folder with its leading "/"; empty for the folder itself
    mode_t mode = 0;   ///< as in st_mode: a folder, file, link or pipe
    FileState state;
  };

  std::string folder;
  std::vector<Entry> entries;  ///< each folder before what is in it
  std::uint64_t bytes = 0;     ///< of all files
  std::int64_t begun = 0;      ///< fileClock() before the first file was looked at
};

/// Lists a folder without what runs have made in it (RunMadeEntries), and without sockets and devices. Links are not
/// followed. `look` is called for each entry and may throw. Throws FatalError where something cannot be read.
FolderListing listFolder(const std::string& folder, std::string_view processFolderPrefix,
                         const std::function<void()>& look = {});

}  // namespace mirevo
