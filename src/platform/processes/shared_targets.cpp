#include "platform/processes/shared_targets.h"

#include <algorithm>
#include <filesystem>
#include <functional>
#include <sys/stat.h>
#include <system_error>
#include <utility>

#include <fmt/core.h>

#include "common/paths.h"
#include "platform/processes/leaving_links.h"

namespace mirevo {
namespace {

namespace fs = std::filesystem;

/// Entries looked at in the process folder, and behind each link; links of which that is done.
constexpr int kMostEntries = 5000;
constexpr std::size_t kMostTargets = 100;

/// Calls `visit` with the paths in a folder, not through links, until there are no more or too many. Returns the reason
/// why it ended before, if it did.
std::error_code visitEntries(const std::string& folder, const std::function<void(const fs::directory_entry&)>& visit) {
  std::error_code failed;
  fs::recursive_directory_iterator entry(folder, fs::directory_options::skip_permission_denied, failed);
  for (int i = 0; i < kMostEntries && !failed && entry != fs::recursive_directory_iterator(); ++i) {
    visit(*entry);
    entry.increment(failed);
  }
  return failed;
}

std::uint64_t stateOfEntry(const std::string& path) {
  struct stat status {};
  if (::lstat(path.c_str(), &status) != 0) return 0;
  const std::string state = fmt::format("{} {} {} {} {}", path, status.st_ino, status.st_mtim.tv_sec,
                                        status.st_mtim.tv_nsec, S_ISDIR(status.st_mode) ? 0 : status.st_size);
  return std::hash<std::string>()(state);
}

/// A sum, as the system lists the entries in any order.
std::uint64_t stateOf(const std::string& path) {
  std::uint64_t state = stateOfEntry(path);
  visitEntries(path, [&state](const fs::directory_entry& entry) { state += stateOfEntry(entry.path().string()); });
  return state;
}

/// Whether the file has a name outside the folder, as far as the folder can be looked through.
bool hasNameOutside(const std::string& folder, const struct stat& file) {
  nlink_t names = 0;
  int entries = 0;
  visitEntries(folder, [&](const fs::directory_entry& entry) {
    ++entries;
    struct stat status {};
    const bool isSame =
        ::lstat(entry.path().c_str(), &status) == 0 && status.st_ino == file.st_ino && status.st_dev == file.st_dev;
    if (isSame) ++names;
  });
  return entries < kMostEntries && names < file.st_nlink;
}

}  // namespace

SharedTargets::SharedTargets(const std::string& folder, std::span<const std::string> own) : looksForHardLinks_(true) {
  const std::string root = resolvedPath(folder);
  const std::error_code failed = visitEntries(root, [&](const fs::directory_entry& entry) {
    std::error_code ignored;
    if (targets_.size() == kMostTargets || !entry.is_symlink(ignored)) return;
    const std::string path = entry.path().string();
    auto link = findLeavingLink(root, std::string_view(path).substr(root.size()));
    if (link && !link->fault.empty()) problems_.push_back(describe(*link));
    if (!link || link->link != path || !link->fault.empty()) return;
    const auto contains = [&link](const std::string& each) {
      return pathInFolder(resolvedPath(each), link->target).has_value();
    };
    if (std::any_of(own.begin(), own.end(), contains)) return;
    const std::uint64_t state = stateOf(link->target);
    targets_.push_back({std::move(link->link), std::move(link->target), state});
  });
  if (failed) problems_.push_back(fmt::format("Unable to look for links in {}: {}", root, failed.message()));
}

std::vector<std::string> SharedTargets::takeChanged() {
  std::vector<std::string> lines = std::exchange(problems_, {});
  for (const Target& target : std::exchange(targets_, {})) {
    if (stateOf(target.path) == target.state) continue;
    lines.push_back(fmt::format(
        "{} was changed during the first model run. The link {} leads to it from every process folder: if the "
        "model writes there, model runs at the same time disturb each other. Replace the link in the "
        "model's folder with a folder or file.",
        target.path, target.link));
  }
  return lines;
}

std::vector<std::string> SharedTargets::takeHardLinked(const std::string& folder, std::span<const std::string> files) {
  std::vector<std::string> lines;
  if (!looksForHardLinks_) return lines;
  for (const std::string& file : files) {
    struct stat status {};
    const std::string path = folder + file;
    if (::stat(path.c_str(), &status) != 0 || !S_ISREG(status.st_mode) || status.st_nlink < 2) continue;
    if (!hasNameOutside(folder, status)) continue;
    lines.push_back(fmt::format(
        "{} has another name outside its process folder, by a hard link: if other model runs write the same "
        "file, those at the same time disturb each other. Let the model write a file of its own.",
        path));
  }
  looksForHardLinks_ = lines.empty();
  return lines;
}

}  // namespace mirevo
