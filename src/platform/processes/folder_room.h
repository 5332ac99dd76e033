#pragma once

#include <cstdint>
#include <string>
#include <system_error>

namespace mirevo {

/// What a copy of a folder takes.
struct FolderExtent {
  std::uintmax_t bytes = 0;
  std::uintmax_t entries = 0;  ///< files and folders

  bool exceeds(const FolderExtent& other) const { return bytes > other.bytes || entries > other.entries; }
};

/// The extent of a folder, links not followed and the holes of files filled in; counting ends as soon as it
/// exceeds `most`, or where something cannot be read, with the reason in `failed`.
FolderExtent extentOf(const std::string& folder, std::error_code& failed,
                      const FolderExtent& most = {UINTMAX_MAX, UINTMAX_MAX});

/// Why there is no room for a copy of the folder `source` in the folder `where`, if `runs` model runs that go on beside
/// it may each need as much again: "it needs 4.2 MB ...". Empty if there is room, or the system does not tell.
std::string whyNoRoom(const std::string& source, const std::string& where, int runs);

}  // namespace mirevo
