#include "report/analysis_table.h"

#include <fmt/format.h>

#include "common/files.h"

namespace mirevo {

std::string unshownTable(const std::string& path, const std::string& reason) {
  if (reason.empty()) return fileNameOf(path) + " is cut off or damaged, and what it has is not shown";
  return fmt::format("{} cannot be read, and what it has is not shown: {}", fileNameOf(path), reason);
}

std::optional<ReadTable> readAnalysisTable(const std::string& path, std::string& fault) {
  std::string reason;
  const auto text = readTextFile(path, reason);
  if (text) {
    ReadTable table = readDataTable(*text);
    if (!table.isDamaged) return table;
    reason.clear();
  }
  fault = unshownTable(path, reason);
  return std::nullopt;
}

}  // namespace mirevo
