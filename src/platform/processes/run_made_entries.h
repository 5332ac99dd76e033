#pragma once

#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// Tells the files and folders that runs of this program have made in a folder from those of the model. If a setup is
/// in the model's folder both are there, and copies of the folder must have those of the model only: results grow from
/// run to run, and another rank of the job may be writing or renaming them.
class RunMadeEntries final {
 public:
  /// `names` are those of all entries of the folder; setups are recognised by their ending ".kdx".
  RunMadeEntries(std::string folder, std::span<const std::string> names);

  bool contains(std::string_view name) const;

 private:
  bool belongsToRunOf(std::string_view setup, std::string_view name) const;
  std::string pathOf(std::string_view name) const;

  std::string folder_;
  std::vector<std::string> setups_;  ///< names without ".kdx"
};

}  // namespace mirevo
