#pragma once

#include <string>
#include <vector>

namespace mirevo {

/// The output files of the model that are kept of every run, each run's in a folder named by its evaluation number.
class SavedFiles final {
 public:
  SavedFiles() = default;
  /// `files` lie in or below `baseFolder`; all are absolute.
  SavedFiles(const std::vector<std::string>& files, const std::string& baseFolder, std::string folder);

  /// Before a run: marks what lies in the process folder from before, so that save() can tell it from what the run
  /// writes. The files stay, as the model may read them.
  void markAsOld(const std::string& processFolder) const;
  /// After a run: copies each file to folder/number, its path below the base folder kept. Returns one line for each
  /// file that could not be kept, or that the run did not write.
  std::vector<std::string> save(const std::string& processFolder, int number) const;

 private:
  std::vector<std::string> names_;  ///< below the base folder, with their leading "/"
  std::string folder_;
};

}  // namespace mirevo
