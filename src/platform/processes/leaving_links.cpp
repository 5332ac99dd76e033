#include "platform/processes/leaving_links.h"

#include <filesystem>
#include <iterator>
#include <system_error>
#include <utility>

#include <fmt/core.h>

#include "common/paths.h"

namespace mirevo {
namespace {

namespace fs = std::filesystem;

/// As many as the system itself follows before it takes them for a circle.
constexpr int kMostLinks = 40;

bool isLink(const fs::path& path) {
  std::error_code ignored;
  return fs::is_symlink(fs::symlink_status(path, ignored));
}

/// What the link leads to, which may be a link again; its folder without links.
fs::path nextOf(const fs::path& link) {
  std::error_code ignored;
  const fs::path next = link.parent_path() / fs::read_symlink(link, ignored);
  return fs::path(resolvedPath(next.parent_path().string())) / next.filename();
}

/// The last link in `root` on the way from `link` out of it.
fs::path lastLinkIn(const std::string& root, fs::path link) {
  for (int i = 0; i < kMostLinks; ++i) {
    fs::path next = nextOf(link);
    if (!isLink(next) || !pathInFolder(next.native(), root)) break;
    link = std::move(next);
  }
  return link;
}

}  // namespace

std::string resolvedPath(const std::string& path) {
  std::error_code failed;
  const fs::path resolved = fs::weakly_canonical(path, failed);
  return failed ? fs::path(path).lexically_normal().string() : resolved.string();
}

std::string describe(const LeavingLink& link) {
  if (!link.fault.empty()) return fmt::format("the link {} cannot be read: {}", link.link, link.fault);
  return fmt::format(
      "the link {} leads to {}, out of the process folder, where other model runs may write the same file; let the "
      "model write into its own folder",
      link.link, link.target);
}

std::optional<LeavingLink> findLeavingLink(const std::string& folder, std::string_view path) {
  std::string root;  // resolved at the first link only, as most paths have none and are looked at for every run
  fs::path at = folder;
  const fs::path below = fs::path(path).relative_path();
  for (auto part = below.begin(); part != below.end(); ++part) {
    at /= *part;
    if (!isLink(at)) continue;
    if (root.empty()) {
      root = resolvedPath(folder);
      at = root / at.lexically_relative(folder);
    }
    const bool isForFolder = std::next(part) != below.end();
    std::error_code failed;
    static_cast<void>(fs::read_symlink(at, failed));
    if (failed) return LeavingLink{at.string(), {}, isForFolder, failed.message()};
    std::string target = resolvedPath(nextOf(at).string());
    if (!pathInFolder(target, root)) {
      return LeavingLink{lastLinkIn(root, at).string(), std::move(target), isForFolder};
    }
    at = std::move(target);
  }
  return std::nullopt;
}

}  // namespace mirevo
