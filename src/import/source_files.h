#pragma once

#include <string>
#include <string_view>

#include "import/import_notes.h"

namespace mirevo {

/// The folder in which a file of another program stands, and the files that it names there.
class SourceFiles final {
 public:
  /// `folder` is absolute.
  explicit SourceFiles(std::string folder) : folder_(std::move(folder)) {}

  const std::string& folder() const { return folder_; }
  /// A name as it is here, relative to the folder: with / between folders. Backslashes are noted. Throws FatalError for
  /// a file outside the folder, which a model run has no copy of.
  std::string nameOf(std::string_view name, const SourcePlace& place, ImportNotes& notes) const;
  bool exists(const std::string& name) const;
  /// The content of a file; throws FatalError, with the place that names it, where it cannot be read.
  std::string read(const std::string& name, const SourcePlace& place) const;

 private:
  std::string folder_;
};

/// A line that starts the model, as a line of a shell. What may not work there is noted.
std::string shellCommand(const std::string& command, const SourcePlace& place, const SourceFiles& files,
                         ImportNotes& notes);

}  // namespace mirevo
