#include "platform/processes/process_folder.h"

#include <array>
#include <cerrno>
#include <climits>
#include <cstdint>
#include <fcntl.h>
#include <filesystem>
#include <sys/stat.h>
#include <unistd.h>
#include <unordered_set>
#include <utility>

#include <fmt/core.h>

#include "common/descriptor.h"
#include "common/fatal_error.h"
#include "common/file_copy.h"
#include "common/paths.h"
#include "common/replaceable_files.h"
#include "common/run_files.h"
#include "platform/processes/folder_tree.h"
#include "platform/processes/leaving_links.h"

namespace mirevo {
namespace {

using namespace folder_tree;

void copyTimes(int to, const struct stat& status) {
  const std::array<timespec, 2> times = {status.st_atim, status.st_mtim};
  ::futimens(to, times.data());  // a copy with other times is still a copy
}

/// Copies files, and tells `progress` of it. It remembers whether the disk shares blocks between files, so that this is
/// tried once.
class FileCopies final {
 public:
  explicit FileCopies(CopyProgress& progress) : progress_(progress) {}

  void copy(const std::string& source, const std::string& target) {
    // One that another has replaced is there again under its name; a model must not lack it.
    if (!isCopied(source, target)) isCopied(source, target);
  }

 private:
  /// False if the file has vanished.
  bool isCopied(const std::string& source, const std::string& target) {
    const Descriptor from(::open(source.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK));
    if (from.get() < 0 && hasVanished(errno)) return false;
    struct stat status {};
    if (from.get() < 0 || ::fstat(from.get(), &status) != 0) fail("read", source, errno);
    if (!S_ISREG(status.st_mode)) return true;  // something else has taken its place
    Descriptor to(::open(target.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, S_IRUSR | S_IWUSR));
    if (to.get() < 0) fail("create", target, errno);
    const auto told = [this](std::uint64_t bytes) { progress_.add(bytes); };
    if (status.st_size > 0 && !copyContent(from.get(), to.get(), told, sharing_)) {
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

  CopyProgress& progress_;
  BlockSharing sharing_ = BlockSharing::unknown;
};

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

/// First of all, so that the folder is known for what it is, however the copying ends.
void makeMark(const std::string& folder) {
  const std::string path = folder + "/" + run_files::kFolderMark;
  Descriptor mark(::open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0666));
  if (mark.get() < 0 || !mark.close()) fail("create", path, errno);
}

/// Makes a copy of a listed folder.
class FolderCopy final {
 public:
  /// Entries whose paths are in `remaining` are there already. `isMarked`: the copy gets the mark of a process folder.
  FolderCopy(const FolderListing& listing, const std::string& target, const FolderMaking& making,
             const std::unordered_set<std::string>& remaining, bool isMarked, CopyProgress& progress)
      : listing_(listing),
        target_(target),
        making_(making),
        remaining_(remaining),
        isMarked_(isMarked),
        progress_(progress),
        files_(progress) {}

  void copyAll() {
    for (const FolderListing::Entry& entry : listing_.entries) {
      const bool isThere = remaining_.contains(entry.path);
      if (!isThere) copyEntry(entry);
      if (S_ISREG(entry.mode)) progress_.addFile(static_cast<std::uint64_t>(entry.state.size), isThere);
    }
    // Folders are writable while they are filled; their modes and times are set afterwards.
    for (auto entry = listing_.entries.rbegin(); entry != listing_.entries.rend(); ++entry) {
      if (!S_ISDIR(entry->mode)) continue;
      const std::string folder = target_ + entry->path;
      const Descriptor opened(::open(folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
      if (opened.get() < 0 || ::fchmod(opened.get(), (entry->mode & 07777) | S_IRWXU) != 0) {
        fail("set the mode of", folder, errno);
      }
      const std::int64_t modified = entry->state.modified;
      const std::array<timespec, 2> times = {timespec{0, UTIME_OMIT},
                                             timespec{modified / kSecond, static_cast<long>(modified % kSecond)}};
      ::futimens(opened.get(), times.data());  // a copy with other times is still a copy
    }
  }

 private:
  static constexpr std::int64_t kSecond = 1'000'000'000;

  void copyEntry(const FolderListing::Entry& entry) {
    const std::string from = listing_.folder + entry.path;
    const std::string to = target_ + entry.path;
    if (S_ISDIR(entry.mode)) {
      if (::mkdir(to.c_str(), S_IRWXU) != 0) fail("create the folder", to, errno);
      if (entry.path.empty() && isMarked_) makeMark(to);
    } else if (S_ISLNK(entry.mode)) {
      copyLink(from, to, listing_.folder, target_);
    } else if (S_ISREG(entry.mode)) {
      // Where the disk has no such links, or not so many, a copy does as well.
      if (!making_.links(entry) || ::link(from.c_str(), to.c_str()) != 0) files_.copy(from, to);
    } else if (::mkfifo(to.c_str(), entry.mode & 07777) != 0) {
      fail("create", to, errno);
    }
  }

  const FolderListing& listing_;
  const std::string& target_;
  const FolderMaking& making_;
  const std::unordered_set<std::string>& remaining_;
  bool isMarked_;
  CopyProgress& progress_;
  FileCopies files_;
};

}  // namespace

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
  CopyProgress unseen;
  FolderCopy(listFolder(source, processFolderPrefix), target, {}, {}, false, unseen).copyAll();
}

void requireProcessFolder(const std::string& target) {
  const std::string why = whyNotReplaceable(target, run_files::kProcessFolder);
  if (!why.empty()) fatalError(fmt::format("{} has the name of a process folder. {}", target, why));
}

void makeProcessFolder(const std::string& source, const std::string& target, std::string_view processFolderPrefix) {
  requireProcessFolder(target);
  const FolderListing listing = listFolder(source, processFolderPrefix);
  CopyProgress unseen;
  makeProcessFolderAnew(listing, target, {}, unseen);
}

void makeProcessFolderAnew(const FolderListing& listing, const std::string& target, const FolderMaking& making,
                           CopyProgress& progress) {
  removeTree(target, [&progress] { progress.look(); });
  try {
    FolderCopy(listing, target, making, {}, true, progress).copyAll();
    recordCopies(target, listing, making);
  } catch (const FatalError&) {
    removeIfPossible(target);
    throw;
  }
}

void renewProcessFolder(const FolderListing& listing, const ListedPaths& paths, const std::string& target,
                        const FolderMaking& making, CopyProgress& progress) {
  try {
    const auto remaining = removeAllButUnchanged(target, listing, paths, making, [&progress] { progress.look(); });
    FolderCopy(listing, target, making, remaining, true, progress).copyAll();
    recordCopies(target, listing, making);
  } catch (const FatalError&) {
    removeIfPossible(target);
    throw;
  }
}

}  // namespace mirevo
