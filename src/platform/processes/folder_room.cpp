#include "platform/processes/folder_room.h"

#include <filesystem>
#include <sys/statvfs.h>
#include <system_error>

#include <fmt/core.h>

namespace mirevo {
namespace {

namespace fs = std::filesystem;

constexpr std::uintmax_t kBlock = 4096;
/// What is left to the results and logs of a run, whatever the size of its model.
constexpr FolderExtent kForResults{10'000'000, 100};

std::string megabytes(std::uintmax_t bytes) {
  return fmt::format("{:.1f} MB", static_cast<double>(bytes) / 1e6);
}

}  // namespace

FolderExtent extentOf(const std::string& folder, std::error_code& failed, const FolderExtent& most) {
  FolderExtent extent{kBlock, 1};
  fs::recursive_directory_iterator entry(folder, failed);
  for (; !failed && entry != fs::recursive_directory_iterator(); entry.increment(failed)) {
    std::error_code ignored;
    const bool isFile = entry->symlink_status(ignored).type() == fs::file_type::regular;
    const std::uintmax_t size = isFile ? entry->file_size(ignored) : 1;
    if (!ignored) extent.bytes += (size + kBlock - 1) / kBlock * kBlock;
    ++extent.entries;
    if (extent.exceeds(most)) break;
  }
  return extent;
}

std::string whyNoRoom(const std::string& source, const std::string& where, int runs) {
  struct statvfs disk {};
  if (::statvfs(where.c_str(), &disk) != 0) return {};
  std::error_code failed;
  const FolderExtent copy = extentOf(source, failed);
  if (failed) return fmt::format("Unable to read the folder {}: {}", source, failed.message());
  const auto shares = static_cast<std::uintmax_t>(runs);
  const FolderExtent left{shares * copy.bytes + kForResults.bytes, shares * copy.entries + kForResults.entries};
  if (const std::uintmax_t free = std::uintmax_t{disk.f_bavail} * disk.f_frsize; copy.bytes + left.bytes > free) {
    return fmt::format("it needs {}, and {} must remain for the run, but its disk has only {} free",
                       megabytes(copy.bytes), megabytes(left.bytes), megabytes(free));
  }
  if (disk.f_files > 0 && copy.entries + left.entries > disk.f_favail) {  // 0: the file system has no such limit
    return fmt::format("it is {} files, and {} more must remain for the run, but its disk has room for only {}",
                       copy.entries, left.entries, disk.f_favail);
  }
  return {};
}

}  // namespace mirevo
