#include "platform/processes/folder_tree.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <dirent.h>
#include <memory>
#include <unistd.h>

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "common/run_files.h"

namespace mirevo {
namespace folder_tree {

void fail(std::string_view what, const std::string& path, int error) {
  fatalError(fmt::format("Unable to {} {}: {}", what, path, std::strerror(error)));
}

bool hasVanished(int error) {
  return error == ENOENT || error == ESTALE;
}

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

std::optional<struct stat> statusOf(const std::string& path) {
  struct stat status {};
  if (::lstat(path.c_str(), &status) == 0) return status;
  if (errno == ESTALE && ::lstat(path.c_str(), &status) == 0) return status;  // another took its place
  if (!hasVanished(errno)) fail("look at", path, errno);
  return std::nullopt;
}

bool isOwn(std::string_view name) {
  return name == run_files::kBatchLog || name == run_files::kFolderMark;
}

}  // namespace folder_tree

using namespace folder_tree;

void removeTree(const std::string& root, const std::function<void()>& look) {
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
    if (look) look();
    if (visit.emptied) {
      if (::rmdir(visit.path.c_str()) != 0 && !hasVanished(errno)) fail("remove the folder", visit.path, errno);
      continue;
    }
    const auto status = statusOf(visit.path);
    if (!status) continue;
    if (!S_ISDIR(status->st_mode)) {
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

}  // namespace mirevo
