// Any bytes as an input file of Ostrich: its lines are all kept, and it gives a case or a refusal that names the file.
// A template of any bytes keeps its lines.

#include <algorithm>
#include <cstdint>
#include <string>
#include <string_view>

#include "common/fatal_error.h"
#include "common/text.h"
#include "import/ostrich_case.h"
#include "import/ostrich_input.h"
#include "import/ostrich_outputs.h"
#include "require.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace mirevo;
  const std::string_view text(reinterpret_cast<const char*>(data), size);
  try {
    const OstrichInput input = parseOstrichInput("ostIn.txt", text);
    for (const OstrichLine& line : input.settings) require(!line.words.empty());
    importOstrichInput("ostIn.txt", text, SourceFiles("/nonexistent"));
  } catch (const FatalError& error) {
    require(error.message().starts_with("Error: Unable to import "));
  }
  try {
    ImportNotes notes;
    const std::string marked = markedTemplate("t", text, {"k", "k1", "p_b"}, 6, notes);
    const auto count = std::count(marked.begin(), marked.end(), '\n');
    require(static_cast<std::size_t>(count) == splitLines(text).size() + 1);
  } catch (const FatalError& error) {
    require(error.message() == "Error: Unable to import t");
  }
  return 0;
}
