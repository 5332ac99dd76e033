#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// What a model run needs in its process folder, a copy of the base folder; the files are paths below these with their
/// leading "/".
struct FolderNeeds {
  std::vector<std::string> parameterFiles;
  std::vector<std::string> outputs;  ///< the simulated files and the output-measure file
  std::vector<std::string> savedFiles;
  std::vector<std::string> batchFiles;

  /// The files that must be each slot's own.
  std::vector<std::string> ownFiles() const;
};

/// Why a model cannot be run in a process folder as an earlier run has left it.
struct FolderDamage {
  std::string what;      ///< "Unable to open /model/basin_Process1/parameters.txt"
  std::string why;       ///< "No such file or directory"
  bool isFinal = false;  ///< the folder could not be made anew, which `why` tells; else it was, and is damaged again

  std::string text() const { return what + ": " + why; }
};

std::optional<FolderDamage> findDamage(const std::string& folder, const FolderNeeds& needs);

/// What to warn of when `who`, a slot or worker, is given up.
std::string givenUpWarning(std::string_view who, const FolderDamage& damage);
/// What ends a run that has no slot left, with the damage of the last one.
[[noreturn]] void failWithoutSlots(const FolderDamage& last);

}  // namespace mirevo
