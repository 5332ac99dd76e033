#include "platform/processes/folder_listing.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <ctime>
#include <sys/vfs.h>
#include <utility>

#include "common/run_files.h"
#include "common/take_text.h"
#include "common/text.h"
#include "platform/processes/folder_tree.h"
#include "platform/processes/run_made_entries.h"

namespace mirevo {
namespace {

using namespace folder_tree;

/// Of ext2 to ext4, XFS and Btrfs, as statfs(2) gives them.
constexpr std::array<std::uint32_t, 3> kReliableFileSystems{0xEF53, 0x58465342, 0x9123683E};

std::int64_t nanoseconds(const timespec& time) {
  return std::int64_t{time.tv_sec} * 1'000'000'000 + time.tv_nsec;
}

/// The folder in which this run makes its process folders, and how their names begin.
class ProcessFolderNames final {
 public:
  explicit ProcessFolderNames(std::string_view prefix) {
    const std::size_t slash = prefix.rfind('/');
    beginning_ = prefix.substr(slash + 1);
    isKnown_ = ::stat(std::string(prefix.substr(0, slash + 1)).c_str(), &parent_) == 0;
  }

  /// Compares device and inode, as the path may contain a link.
  bool liesIn(const struct stat& folder) const {
    return isKnown_ && folder.st_dev == parent_.st_dev && folder.st_ino == parent_.st_ino;
  }
  bool contains(std::string_view name) const {
    if (!takeText(name, beginning_)) return false;
    return name == run_files::kProcessLock.extension || isDigits(name);
  }

 private:
  std::string_view beginning_;
  struct stat parent_ {};
  bool isKnown_ = false;
};

}  // namespace

FileState stateOf(const struct stat& status) {
  return {status.st_dev, status.st_ino, status.st_size, nanoseconds(status.st_mtim), nanoseconds(status.st_ctim)};
}

std::int64_t fileClock() {
  timespec now{};
  ::clock_gettime(CLOCK_REALTIME_COARSE, &now);
  return nanoseconds(now);
}

bool hasReliableTimes(const std::string& folder) {
  struct statfs system {};
  return ::statfs(folder.c_str(), &system) == 0 &&
         std::find(kReliableFileSystems.begin(), kReliableFileSystems.end(),
                   static_cast<std::uint32_t>(system.f_type)) != kReliableFileSystems.end();
}

FolderListing listFolder(const std::string& folder, std::string_view processFolderPrefix,
                         const std::function<void()>& look) {
  const ProcessFolderNames processFolders(processFolderPrefix);
  FolderListing listing{folder, {}, 0, fileClock()};
  std::vector<std::string> pending{""};  // folders, without recursion
  while (!pending.empty()) {
    const std::string below = std::move(pending.back());
    pending.pop_back();
    const std::string path = folder + below;
    const auto names = namesIn(path);
    struct stat status {};
    if (!names || ::stat(path.c_str(), &status) != 0) {
      const int error = names ? errno : ENOENT;
      if (!below.empty() && hasVanished(error)) continue;
      fail("read the folder", path, error);
    }
    listing.entries.push_back({below, status.st_mode, stateOf(status)});
    const bool holdsProcessFolders = processFolders.liesIn(status);
    const RunMadeEntries runMade(path, *names);
    for (const std::string& name : *names) {
      if (look) look();
      const bool isMark = below.empty() && isOwn(name);
      const bool isProcessFolder = holdsProcessFolders && processFolders.contains(name);
      if (isMark || isProcessFolder || runMade.contains(name)) continue;
      std::string entry = below;
      entry.append("/").append(name);
      const auto found = statusOf(folder + entry);
      if (!found) continue;
      if (S_ISDIR(found->st_mode)) {
        pending.push_back(std::move(entry));
      } else if (S_ISREG(found->st_mode) || S_ISLNK(found->st_mode) || S_ISFIFO(found->st_mode)) {
        if (S_ISREG(found->st_mode)) listing.bytes += static_cast<std::uint64_t>(found->st_size);
        listing.entries.push_back({std::move(entry), found->st_mode, stateOf(*found)});
      }
    }
  }
  return listing;
}

}  // namespace mirevo
