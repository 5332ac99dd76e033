#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "import/import_notes.h"

namespace mirevo {

/// A line of an input file of Ostrich, in words: the first one is the keyword outside of a block.
struct OstrichLine {
  SourcePlace place;
  std::vector<std::string> words;
  std::string text;  ///< without the comment
};

/// What stands between `BeginName` and `EndName`.
struct OstrichBlock {
  SourcePlace place;
  std::string name;  ///< as written, without "Begin"
  std::vector<OstrichLine> lines;
};

/// `ostIn.txt`, after the published manual: Matott, OSTRICH: An Optimization Software Tool, Documentation and User's
/// Guide.
struct OstrichInput {
  std::vector<OstrichLine> settings;
  std::vector<OstrichBlock> blocks;

  /// The last line with this keyword, whatever its case; null if there is none.
  const OstrichLine* setting(std::string_view keyword) const;
  const OstrichBlock* block(std::string_view name) const;
};

/// Throws FatalError with the place and what was expected.
OstrichInput parseOstrichInput(const std::string& sourceName, std::string_view text);

}  // namespace mirevo
