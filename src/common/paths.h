#pragma once

#include <optional>
#include <string_view>

namespace mirevo {

/// What of `path` stands behind `folder` and its "/": "data/flow.csv", empty for the folder itself; nothing for a path
/// that does not lie in it. Both are absolute and in normal form; links are not looked at.
constexpr std::optional<std::string_view> pathInFolder(std::string_view path, std::string_view folder) {
  if (folder.ends_with('/')) folder.remove_suffix(1);
  if (!path.starts_with(folder)) return std::nullopt;
  path.remove_prefix(folder.size());
  if (path.empty()) return path;
  if (path.front() != '/') return std::nullopt;
  return path.substr(1);
}

}  // namespace mirevo
