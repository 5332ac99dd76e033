#include "platform/process_folder.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <climits>
#include <cstring>
#include <dirent.h>
#include <fcntl.h>
#include <filesystem>
#include <memory>
#include <sys/stat.h>
#include <unistd.h>
#include <vector>

#include <fmt/format.h>

#include "common/descriptor.h"
#include "common/fatal_error.h"
#include "platform/file_copy.h"

namespace mirevo {
namespace {

[[noreturn]] void fail(std::string_view what, const std::string& path, int error) {
  fatalError(fmt::format("Unable to {} {}: {}", what, path, std::strerror(error)));
}

/// The names in a folder, sorted, without "." and "..".
std::vector<std::string> namesIn(const std::string& path) {
  const std::unique_ptr<DIR, int (*)(DIR*)> folder(::opendir(path.c_str()), &::closedir);
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

struct stat statusOf(const std::string& path) {
  struct stat status {};
  if (::lstat(path.c_str(), &status) != 0) fail("look at", path, errno);
  return status;
}

bool isFolder(const struct stat& status) {
  return S_ISDIR(status.st_mode);
}

/// Removes a file, a link, or a folder with all that it holds. Nothing need be there.
void removeTree(const std::string& root) {
  struct stat status {};
  if (::lstat(root.c_str(), &status) != 0) {
    if (errno == ENOENT) return;
    fail("look at", root, errno);
  }
  // Depth-first with a stack of our own: each folder is met once to empty it and, above its entries, once to remove it.
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
      if (::rmdir(visit.path.c_str()) != 0) fail("remove the folder", visit.path, errno);
      continue;
    }
    if (!isFolder(statusOf(visit.path))) {
      if (::unlink(visit.path.c_str()) != 0) fail("remove", visit.path, errno);
      continue;
    }
    ::chmod(visit.path.c_str(), S_IRWXU);  // a model may have made it read-only; a failure shows below
    visits.push_back({visit.path, true});
    for (const std::string& name : namesIn(visit.path)) visits.push_back({visit.path + "/" + name, false});
  }
}

void copyTimes(int to, const struct stat& status) {
  const std::array<timespec, 2> times = {status.st_atim, status.st_mtim};
  ::futimens(to, times.data());  // a copy with other times is still a copy
}

void copyFile(const std::string& source, const std::string& target, const struct stat& status) {
  const Descriptor from(::open(source.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW));
  if (from.get() < 0) fail("read", source, errno);
  const Descriptor to(::open(target.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, S_IRUSR | S_IWUSR));
  if (to.get() < 0) fail("create", target, errno);
  if (status.st_size > 0 && !copyContent(from.get(), to.get())) fail("write", target, errno);
  if (::fchmod(to.get(), status.st_mode & 07777) != 0) fail("set the mode of", target, errno);
  copyTimes(to.get(), status);
}

bool liesIn(const std::filesystem::path& path, const std::filesystem::path& folder) {
  return std::mismatch(folder.begin(), folder.end(), path.begin(), path.end()).first == folder.end();
}

/// Copies the link `source`, below `sourceRoot`, to `target`.
void copyLink(const std::string& source, const std::string& target, const std::string& sourceRoot,
              const std::string& targetRoot) {
  std::array<char, PATH_MAX> buffer{};
  const ssize_t length = ::readlink(source.c_str(), buffer.data(), buffer.size());
  if (length < 0) fail("read the link", source, errno);
  const std::string text(buffer.data(), static_cast<std::size_t>(length));
  const std::filesystem::path written(text);
  const auto meant = (std::filesystem::path(source).parent_path() / written).lexically_normal();
  const bool inside = liesIn(meant, sourceRoot);
  std::string content = text;
  if (written.is_absolute() && inside) {
    content = (std::filesystem::path(targetRoot) / meant.lexically_relative(sourceRoot)).lexically_normal().string();
  } else if (written.is_relative() && !inside) {
    content = meant.string();
  }
  if (::symlink(content.c_str(), target.c_str()) != 0) fail("create the link", target, errno);
}

bool isNumber(std::string_view text) {
  return !text.empty() && text.find_first_not_of("0123456789") == std::string_view::npos;
}

/// Whether the folder holds the saved output files of a run, or of an earlier one, of a setup that lies beside it.
bool isSavedOutput(std::string_view path) {
  static constexpr std::string_view kMark = "_Saved";
  const auto mark = path.rfind(kMark);
  if (mark == std::string_view::npos) return false;
  const std::string_view rest = path.substr(mark + kMark.size());
  if (!rest.empty() && !(rest.front() == '.' && isNumber(rest.substr(1)))) return false;
  struct stat status {};
  return ::stat(std::string(path.substr(0, mark)).append(".kdx").c_str(), &status) == 0;
}

/// Whether the folder is what a run makes, this or another, and not the model's.
bool isMadeByRuns(const std::string& path, std::string_view prefix) {
  if (path.starts_with(prefix) && isNumber(std::string_view(path).substr(prefix.size()))) return true;
  if (isSavedOutput(path)) return true;
  static constexpr std::string_view kMark = "_Process";
  const auto mark = path.rfind(kMark);
  if (mark == std::string::npos || !isNumber(std::string_view(path).substr(mark + kMark.size()))) return false;
  struct stat status {};
  return ::stat((path + "/" + kBatchLogName).c_str(), &status) == 0;
}

struct CopiedFolder {
  std::string target;
  struct stat status;
};

}  // namespace

void makeProcessFolder(const std::string& source, const std::string& target, std::string_view processFolderPrefix) {
  removeTree(target);
  std::vector<std::string> pending = {""};  // paths below the root, each with its leading "/"
  std::vector<CopiedFolder> made;
  while (!pending.empty()) {
    const std::string below = std::move(pending.back());
    pending.pop_back();
    const std::vector<std::string> names = namesIn(source + below);
    // Writable while it is filled; its own mode and time follow when everything is in.
    if (::mkdir((target + below).c_str(), S_IRWXU) != 0) fail("create the folder", target + below, errno);
    made.push_back({target + below, {}});
    if (::stat((source + below).c_str(), &made.back().status) != 0) fail("look at", source + below, errno);
    for (const std::string& name : names) {
      std::string path = below;
      path.append("/").append(name);
      const std::string from = source + path;
      const std::string to = target + path;
      const struct stat status = statusOf(from);
      if (isFolder(status)) {
        if (!isMadeByRuns(from, processFolderPrefix)) pending.push_back(path);
      } else if (S_ISLNK(status.st_mode)) {
        copyLink(from, to, source, target);
      } else if (S_ISREG(status.st_mode)) {
        if (path != std::string("/") + kBatchLogName) copyFile(from, to, status);
      } else if (S_ISFIFO(status.st_mode) && ::mkfifo(to.c_str(), status.st_mode & 07777) != 0) {
        fail("create", to, errno);
      }
    }
  }
  for (auto folder = made.rbegin(); folder != made.rend(); ++folder) {
    const Descriptor opened(::open(folder->target.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (opened.get() < 0 || ::fchmod(opened.get(), (folder->status.st_mode & 07777) | S_IRWXU) != 0) {
      fail("set the mode of", folder->target, errno);
    }
    copyTimes(opened.get(), folder->status);
  }
}

}  // namespace mirevo
