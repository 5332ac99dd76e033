#pragma once

#include <optional>
#include <string>

#include "common/data_table.h"

namespace mirevo {

/// A table that an analysis has written. Empty, with the reason as a sentence without a full stop, where the file
/// cannot be read or is cut off or damaged: part of a table looks like a complete one.
std::optional<ReadTable> readAnalysisTable(const std::string& path, std::string& fault);

/// What to say of such a file; `reason`: why it cannot be read, or empty if it is damaged.
std::string unshownTable(const std::string& path, const std::string& reason = "");

}  // namespace mirevo
