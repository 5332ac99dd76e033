#include "run/access/file_validation.h"

#include <fmt/core.h>

#include "common/files.h"
#include "common/paths.h"

namespace mirevo {
namespace {

/// The file name as written in the setup; the absolute path is in the detail.
std::string shown(const std::string& path, std::string_view keyword, const SetupSection& section) {
  const std::string written = section.written(keyword);
  return written.empty() ? path : written;
}

std::string explained(const std::string& path, std::string_view reason) {
  return path.empty() ? "expected the name of a file, found a blank text" : fmt::format("{}: {}", path, reason);
}

}  // namespace

void validateFileExists(const std::string& path, std::string_view keyword, const SetupSection& section) {
  const std::string fault = faultOfFile(path);
  if (fault.empty()) return;
  section.refuse(fmt::format("Error: The file {} does not exist", shown(path, keyword, section)), keyword,
                 explained(path, fault) +
                     "; expected the name of a file that is there, relative to the setup's folder or absolute");
}

void validateFileOpens(const std::string& path, std::string_view keyword, const SetupSection& section,
                       std::string_view message) {
  std::string reason;
  if (readTextFile(path, reason)) return;
  section.refuse(fmt::format("{}{}", message, shown(path, keyword, section)), keyword, explained(path, reason));
}

void validateInBaseFolder(const std::string& path, const std::string& baseFolder, std::string_view keyword,
                          const SetupSection& section) {
  if (const auto below = pathInFolder(path, baseFolder); below && !below->empty()) return;
  section.refuse(
      fmt::format("Error: The file {} is not located in the base folder {}", shown(path, keyword, section), baseFolder),
      keyword,
      fmt::format("expected a file in or below Base_Folder or, without one, the folder of the first BatchFileName, "
                  "which each model run copies; found {}",
                  path));
}

}  // namespace mirevo
