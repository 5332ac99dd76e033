#pragma once

#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// Tells what runs of this program have made in a folder from what is the model's own. Where a setup lies in the
/// model's folder both stand side by side, and a copy of the folder is to have the model's own only: results grow from
/// run to run, and another rank of the job may be writing them or renaming them meanwhile.
class RunMadeEntries final {
 public:
  /// `names` are those of everything in the folder; setups are known by their ending ".kdx".
  RunMadeEntries(std::string folder, std::span<const std::string> names);

  bool contains(std::string_view name) const;

 private:
  bool belongsToRunOf(std::string_view setup, std::string_view name) const;

  std::string folder_;
  std::vector<std::string> setups_;  ///< names without ".kdx"
};

}  // namespace mirevo
