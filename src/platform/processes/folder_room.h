#pragma once

#include <cstdint>
#include <string>

namespace mirevo {

/// What a copy of a folder takes.
struct FolderExtent {
  std::uintmax_t bytes = 0;
  std::uintmax_t entries = 0;  ///< files and folders

  bool exceeds(const FolderExtent& other) const { return bytes > other.bytes || entries > other.entries; }
};

/// The extent of a folder, links not followed and files without their holes filled in; counting ends as soon as it
/// exceeds `most`. What may not be looked at counts as nothing.
FolderExtent extentOf(const std::string& folder, const FolderExtent& most = {UINTMAX_MAX, UINTMAX_MAX});

/// Why there is no room for a copy of the folder `source` in the folder `where`, if `runs` model runs that go on beside
/// it may each need as much again: "it needs 4.2 MB ...". Empty if there is room, or the system does not tell.
std::string whyNoRoom(const std::string& source, const std::string& where, int runs);

}  // namespace mirevo
