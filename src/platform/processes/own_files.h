#pragma once

#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// Throws FatalError if the model's folder has, on the way to one of `files`, a link out of it that makeFilesOwn()
/// could not replace. `files` are paths below the folder with their leading "/". Returns a line for each link to a
/// folder that it will replace.
std::vector<std::string> requireOwnFiles(const std::string& baseFolder, std::span<const std::string> files);

/// Makes sure that each of `files` lies in the process folder `folder`, a copy of the model's folder, and in no other:
/// a link on the way to it that leads out of the folder is replaced with a copy of what it leads to, or removed if it
/// is the file itself and leads to none. Throws FatalError, also where what a link leads to is too large for a copy in
/// every process folder.
void makeFilesOwn(const std::string& folder, const std::string& baseFolder, std::span<const std::string> files,
                  std::string_view processFolderPrefix);

}  // namespace mirevo
