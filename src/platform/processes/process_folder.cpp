#include "platform/processes/process_folder.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <climits>
#include <cstring>
#include <dirent.h>
#include <fcntl.h>
#include <filesystem>
#include <memory>
#include <optional>
#include <sys/stat.h>
#include <unistd.h>
#include <utility>
#include <vector>

#include <fmt/core.h>

#include "common/descriptor.h"
#include "common/fatal_error.h"
#include "common/file_copy.h"
#include "common/paths.h"
#include "common/replaceable_files.h"
#include "common/run_files.h"
#include "common/take_text.h"
#include "platform/processes/leaving_links.h"
#include "platform/processes/run_made_entries.h"

namespace mirevo {
namespace {

[[noreturn]] void fail(std::string_view what, const std::string& path, int error) {
  fatalError(fmt::format("Unable to {} {}: {}", what, path, std::strerror(error)));
}

/// Whether the error means that an entry seen a moment ago is gone. If a setup is in its model's folder, other ranks of
/// the job and runs of other setups may be working in the folder that is copied.
bool hasVanished(int error) {
  return error == ENOENT || error == ESTALE;
}

/// The names in a folder, sorted, without "." and ".."; empty when there is no such folder.
std::optional<std::vector<std::string>> namesIn(const std::string& path) {
  const std::unique_ptr<DIR, int (*)(DIR*)> folder(::opendir(path.c_str()), &::closedir);
  if (!folder && hasVanished(errno)) return std::nullopt;
  if (!folder) fail("read the folder", path, errno);
  std::vector<std::string> names;
  errno = 0;
  while (const dirent* entry = ::readdir(folder.get())) {
    const std::string_view name = entry->d_name;
    if (name != "." && name != "..") names.emplace_back(name);
    errno = 0;
  }
  if (errno != 0) fail("read the folder", path, errno);
  std::sort(names.begin(), names.end());
  return names;
}

/// The status of `path` itself, not of a link's target; empty when nothing is there.
std::optional<struct stat> statusOf(const std::string& path) {
  struct stat status {};
  if (::lstat(path.c_str(), &status) == 0) return status;
  if (errno == ESTALE && ::lstat(path.c_str(), &status) == 0) return status;  // another took its place
  if (!hasVanished(errno)) fail("look at", path, errno);
  return std::nullopt;
}

bool isFolder(const struct stat& status) {
  return S_ISDIR(status.st_mode);
}

/// Whether the entry of a process folder is not the model's.
bool isOwn(std::string_view name) {
  return name == run_files::kBatchLog || name == run_files::kFolderMark;
}

void copyTimes(int to, const struct stat& status) {
  const std::array<timespec, 2> times = {status.st_atim, status.st_mtim};
  ::futimens(to, times.data());  // a copy with other times is still a copy
}

/// False if the file has vanished.
bool isFileCopied(const std::string& source, const std::string& target, const struct stat& status) {
  const Descriptor from(::open(source.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW));
  if (from.get() < 0 && hasVanished(errno)) return false;
  if (from.get() < 0) fail("read", source, errno);
  Descriptor to(::open(target.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, S_IRUSR | S_IWUSR));
  if (to.get() < 0) fail("create", target, errno);
  if (status.st_size > 0 && !copyContent(from.get(), to.get())) {
    const int error = errno;
    if (!hasVanished(error)) fail("write", target, error);
    ::unlink(target.c_str());  // removed on another machine that has this disk
    return false;
  }
  if (::fchmod(to.get(), status.st_mode & 07777) != 0) fail("set the mode of", target, errno);
  copyTimes(to.get(), status);
  if (!to.close()) fail("write", target, errno);
  return true;
}

void copyFile(const std::string& source, const std::string& target, const struct stat& status) {
  if (isFileCopied(source, target, status)) return;
  // One that another has replaced is there again under its name; a model must not lack it.
  const auto now = statusOf(source);
  if (now && S_ISREG(now->st_mode)) isFileCopied(source, target, *now);
}

/// Whether a relative link in a folder, `below` the root, leads to its target without leaving the root.
bool staysInside(const std::filesystem::path& below, const std::filesystem::path& link) {
  int depth = 0;
  for (const std::filesystem::path& way : {below, link}) {
    for (const std::filesystem::path& part : way) {
      if (part == "..") {
        if (--depth < 0) return false;
      } else if (part != ".") {
        ++depth;
      }
    }
  }
  return true;
}

/// What the copy of the link `source`, below `sourceRoot`, contains, whose own text is `written`.
std::string linkForCopy(const std::string& source, const std::filesystem::path& written, const std::string& sourceRoot,
                        const std::string& targetRoot) {
  const std::filesystem::path folder = std::filesystem::path(source).parent_path();
  if (written.is_relative() && staysInside(folder.lexically_relative(sourceRoot), written)) {
    return written.string();
  }
  const std::string meant = (folder / written).lexically_normal().string();
  // The root and the link may name the same folder differently, by way of other links.
  const std::string real = resolvedPath((folder / written).string());
  const std::string realRoot = resolvedPath(sourceRoot);
  for (const auto& [path, root] : {std::pair(&meant, &sourceRoot), std::pair(&real, &realRoot)}) {
    if (const auto inside = pathInFolder(*path, *root)) {
      return (std::filesystem::path(targetRoot) / *inside).lexically_normal().string();
    }
  }
  return written.is_absolute() ? written.string() : real;
}

/// Copies the link `source`, below `sourceRoot`, to `target`.
void copyLink(const std::string& source, const std::string& target, const std::string& sourceRoot,
              const std::string& targetRoot) {
  std::array<char, PATH_MAX> buffer{};
  const ssize_t length = ::readlink(source.c_str(), buffer.data(), buffer.size());
  if (length < 0 && hasVanished(errno)) return;
  if (length < 0) fail("read the link", source, errno);
  const std::string text(buffer.data(), static_cast<std::size_t>(length));
  const std::string content = linkForCopy(source, text, sourceRoot, targetRoot);
  if (::symlink(content.c_str(), target.c_str()) != 0) fail("create the link", target, errno);
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

struct CopiedFolder {
  std::string target;
  struct stat status;
};

/// Copies a folder without what runs have made in it; without recursion.
class FolderCopy final {
 public:
  /// `isMarked`: the copy gets the mark of a process folder.
  FolderCopy(const std::string& source, const std::string& target, std::string_view processFolderPrefix, bool isMarked)
      : source_(source), target_(target), processFolders_(processFolderPrefix), isMarked_(isMarked) {}

  void copyAll() {
    pending_ = {""};  // paths below the root, each with its leading "/"
    while (!pending_.empty()) {
      const std::string below = std::move(pending_.back());
      pending_.pop_back();
      copyFolder(below);
    }
    // Folders are writable while they are filled; their modes and times are set afterwards.
    for (auto folder = made_.rbegin(); folder != made_.rend(); ++folder) {
      const Descriptor opened(::open(folder->target.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
      if (opened.get() < 0 || ::fchmod(opened.get(), (folder->status.st_mode & 07777) | S_IRWXU) != 0) {
        fail("set the mode of", folder->target, errno);
      }
      copyTimes(opened.get(), folder->status);
    }
  }

 private:
  void copyFolder(const std::string& below) {
    const std::string from = source_ + below;
    const std::string to = target_ + below;
    const auto names = namesIn(from);
    struct stat status {};
    if (!names || ::stat(from.c_str(), &status) != 0) {
      const int error = names ? errno : ENOENT;
      if (!below.empty() && hasVanished(error)) return;
      fail("read the folder", from, error);
    }
    if (::mkdir(to.c_str(), S_IRWXU) != 0) fail("create the folder", to, errno);
    made_.push_back({to, status});
    if (below.empty() && isMarked_) makeMark(to);
    const bool holdsProcessFolders = processFolders_.liesIn(status);
    const RunMadeEntries runMade(from, *names);
    for (const std::string& name : *names) {
      const bool isMark = below.empty() && isOwn(name);
      const bool isProcessFolder = holdsProcessFolders && processFolders_.contains(name);
      if (isMark || isProcessFolder || runMade.contains(name)) continue;
      std::string path = below;
      copyEntry(path.append("/").append(name));
    }
  }

  /// First of all, so that the folder is known for what it is, however the copying ends.
  static void makeMark(const std::string& folder) {
    const std::string path = folder + "/" + run_files::kFolderMark;
    Descriptor mark(::open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0666));
    if (mark.get() < 0 || !mark.close()) fail("create", path, errno);
  }

  void copyEntry(const std::string& path) {
    const std::string from = source_ + path;
    const std::string to = target_ + path;
    const auto status = statusOf(from);
    if (!status) return;
    if (isFolder(*status)) {
      pending_.push_back(path);
    } else if (S_ISLNK(status->st_mode)) {
      copyLink(from, to, source_, target_);
    } else if (S_ISREG(status->st_mode)) {
      copyFile(from, to, *status);
    } else if (S_ISFIFO(status->st_mode) && ::mkfifo(to.c_str(), status->st_mode & 07777) != 0) {
      fail("create", to, errno);
    }
  }

  const std::string& source_;
  const std::string& target_;
  ProcessFolderNames processFolders_;
  bool isMarked_;
  std::vector<std::string> pending_;
  std::vector<CopiedFolder> made_;
};

}  // namespace

void removeTree(const std::string& root) {
  // Depth-first without recursion: each folder is visited once to push its entries and, after these, once to remove it.
  struct Visit {
    std::string path;
    bool emptied;
  };
  std::vector<Visit> visits;
  visits.push_back({root, false});
  while (!visits.empty()) {
    const Visit visit = visits.back();
    visits.pop_back();
    if (visit.emptied) {
      if (::rmdir(visit.path.c_str()) != 0 && !hasVanished(errno)) fail("remove the folder", visit.path, errno);
      continue;
    }
    const auto status = statusOf(visit.path);
    if (!status) continue;
    if (!isFolder(*status)) {
      if (::unlink(visit.path.c_str()) != 0 && !hasVanished(errno)) fail("remove", visit.path, errno);
      continue;
    }
    ::chmod(visit.path.c_str(), S_IRWXU);  // a model may have made it read-only; a failure is noticed below
    visits.push_back({visit.path, true});
    const auto names = namesIn(visit.path);
    if (!names) continue;
    // The root's mark last: what an interruption leaves is still known for what it is.
    for (const bool pushesOwn : {true, false}) {
      for (const std::string& name : *names) {
        if ((visit.path == root && isOwn(name)) == pushesOwn) visits.push_back({visit.path + "/" + name, false});
      }
    }
  }
}

void removeIfPossible(const std::string& root) {
  try {
    removeTree(root);
  } catch (const FatalError&) {  // what is wrong with its disk or modes is told already
  }
}

std::string processLockPath(std::string_view processFolderPrefix) {
  return std::string(processFolderPrefix).append(run_files::kProcessLock.extension);
}

std::string processFoldersInUse(std::string_view processFolderPrefix, std::string_view holder) {
  return fmt::format(
      "Another run{} works in a folder {}<number>. Wait for it, or give one of the runs another name or "
      "ProcessFolder.",
      holder, processFolderPrefix);
}

void copyFolder(const std::string& source, const std::string& target, std::string_view processFolderPrefix) {
  FolderCopy(source, target, processFolderPrefix, false).copyAll();
}

void makeProcessFolder(const std::string& source, const std::string& target, std::string_view processFolderPrefix) {
  const std::string why = whyNotReplaceable(target, run_files::kProcessFolder);
  if (!why.empty()) fatalError(fmt::format("{} has the name of a process folder. {}", target, why));
  makeProcessFolderAnew(source, target, processFolderPrefix);
}

void makeProcessFolderAnew(const std::string& source, const std::string& target, std::string_view processFolderPrefix) {
  removeTree(target);
  try {
    FolderCopy(source, target, processFolderPrefix, true).copyAll();
  } catch (const FatalError&) {
    removeIfPossible(target);
    throw;
  }
}

}  // namespace mirevo
