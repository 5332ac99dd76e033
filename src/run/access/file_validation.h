#pragma once

#include <string>
#include <string_view>

#include "run/access/setup_access.h"

namespace mirevo {

/// Throws FatalError unless the file `path`, named by the keyword, exists.
void validateFileExists(const std::string& path, std::string_view keyword, const SetupSection& section);
/// Throws FatalError with `message` and the name of the file unless it can be read.
void validateFileOpens(const std::string& path, std::string_view keyword, const SetupSection& section,
                       std::string_view message = "Error: Unable to open ");
/// Throws FatalError unless the file is in the base folder or below it.
void validateInBaseFolder(const std::string& path, const std::string& baseFolder, std::string_view keyword,
                          const SetupSection& section);

}  // namespace mirevo
