#pragma once

#include <string>
#include <vector>

namespace mirevo {

/// A file of the setup that a user may start from.
struct NewFile {
  std::string name;     ///< below the folder
  std::string meaning;  ///< in a few words, for the list of the files
  std::string content;
  unsigned mode = 0666;
};

/// A small setup, `setup.kdx`, with its model and data, which runs as it is.
std::vector<NewFile> newSetupFiles();

/// Writes these files to a folder, which is made if there is none; blank: the current one. Replaces nothing: if any of
/// them is there, none is written. Lists them on standard output. Returns the exit code: 1, and a message, if that
/// fails.
int writeNewSetup(const std::string& folder);

}  // namespace mirevo
