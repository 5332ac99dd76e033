#pragma once

#include <string>
#include <vector>

namespace mirevo {

/// A file that was not kept.
struct UnkeptFile {
  std::string name;            ///< below the base folder, with its leading "/"
  std::string reason;          ///< one line for a person
  bool isModelsDoing = false;  ///< the model run has left nothing that could be kept
};

/// The model's output files that are kept from every model run, each run's in a folder named by its evaluation number.
class SavedFiles final {
 public:
  SavedFiles() = default;
  /// `files` are in or below `baseFolder`; all paths are absolute.
  SavedFiles(const std::vector<std::string>& files, const std::string& baseFolder, std::string folder);

  /// Before a run: marks the files that are in the process folder already, so that save() can tell them from those that
  /// the run writes. They are not removed, as the model may read them.
  void markAsOld(const std::string& processFolder) const;
  /// After a run: copies each file to folder/number, with its path below the base folder. Returns those that could not
  /// be kept, or that the run did not write. Files that are there already are those of an interrupted run, and removed,
  /// or, with `isRepeated`, of an earlier run of the same evaluation, and stay.
  std::vector<UnkeptFile> save(const std::string& processFolder, int number, bool isRepeated = false) const;
  /// One for each file: it was not kept, for this reason.
  std::vector<UnkeptFile> unkept(std::string_view reason) const;

 private:
  std::vector<std::string> names_;  ///< below the base folder, with their leading "/"
  std::string folder_;
};

}  // namespace mirevo
