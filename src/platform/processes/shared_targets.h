#pragma once

#include <cstdint>
#include <span>
#include <string>
#include <vector>

namespace mirevo {

/// What links in a process folder lead to outside it, and so is the same for all model runs.
class SharedTargets final {
 public:
  SharedTargets() = default;
  /// Looks at the links in `folder`, but not at those to folders that contain one of `own`, in which this program
  /// itself writes. Of very many files only some are looked at.
  SharedTargets(const std::string& folder, std::span<const std::string> own);

  /// One line for each link behind which something has been written, created or removed since then, or that could not
  /// be examined; no more at the next call.
  std::vector<std::string> takeChanged();

  /// One line for each of `files` below the process folder `folder` that has a name outside it, too, by a hard link
  /// that the model has made; no more once there was any.
  std::vector<std::string> takeHardLinked(const std::string& folder, std::span<const std::string> files);

 private:
  struct Target {
    std::string link;
    std::string path;
    std::uint64_t state = 0;
  };

  std::vector<Target> targets_;
  std::vector<std::string> problems_;
  bool looksForHardLinks_ = false;
};

}  // namespace mirevo
