#pragma once

#include <string>
#include <string_view>

#include "run/access/setup_access.h"

namespace mirevo {

/// A file that must exist, `path` being what the keyword's value stands for.
void validateFileExists(const std::string& path, std::string_view keyword, const SetupSection& section);
/// A file that must be readable, for the given text before its name.
void validateFileOpens(const std::string& path, std::string_view keyword, const SetupSection& section,
                       std::string_view message = "Error: Unable to open ");
/// A file of the model, which lies in the base folder or below it.
void validateInBaseFolder(const std::string& path, const std::string& baseFolder, std::string_view keyword,
                          const SetupSection& section);

}  // namespace mirevo
