#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace mirevo {

/// A link in a folder that leads out of it.
struct LeavingLink {
  std::string link;          ///< absolute path; of several that lead to one another the last one in the folder
  std::string target;        ///< where it leads in the end; absolute, without links
  bool isForFolder = false;  ///< the path goes on behind it
  std::string fault = {};  ///< the system's reason if the link cannot be read; it is then taken for one that leads out
};

/// The first link on the way from `folder` to `path`, a path below it with its leading "/", that leads out of the
/// folder; empty if there is none, so that what is at `path`, or will be created there, lies in the folder. Links that
/// lead back into it are none of these.
std::optional<LeavingLink> findLeavingLink(const std::string& folder, std::string_view path);

/// As the reason of a failure: "the link ... leads to ..., out of the process folder".
std::string describe(const LeavingLink& link);

/// Where a path leads when all links are followed; what does not exist, or may not be looked at, counts as it is
/// written.
std::string resolvedPath(const std::string& path);

}  // namespace mirevo
