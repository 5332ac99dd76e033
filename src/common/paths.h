#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace mirevo {

/// The part of `path` after `folder` and its "/": "data/flow.csv", an empty text for the folder itself; nothing for a
/// path outside it. Both must be absolute and in normal form; links are not resolved.
constexpr std::optional<std::string_view> pathInFolder(std::string_view path, std::string_view folder) {
  if (folder.ends_with('/')) folder.remove_suffix(1);
  if (!path.starts_with(folder)) return std::nullopt;
  path.remove_prefix(folder.size());
  if (path.empty()) return path;
  if (path.front() != '/') return std::nullopt;
  return path.substr(1);
}

/// The path of the folder that a path with a "/" names something in.
inline std::string folderOf(std::string_view path) {
  return std::string(path.substr(0, path.rfind('/')));
}

}  // namespace mirevo
