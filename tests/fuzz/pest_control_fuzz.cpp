// Any bytes as a control file, with whatever it names beside it: a case, or a refusal that names the file.

#include <algorithm>
#include <cstdint>
#include <string>
#include <string_view>

#include "common/fatal_error.h"
#include "import/imported_case.h"
#include "import/pest_case.h"
#include "import/pest_control.h"
#include "require.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace mirevo;
  const std::string_view text(reinterpret_cast<const char*>(data), size);
  // Behind the first NUL comes what every table of version 2 has.
  const std::size_t end = std::min(text.find('\0'), text.size());
  const std::string table(text.substr(std::min(end + 1, text.size())));
  try {
    ImportNotes notes;
    const PestControl control = parsePestControl(
        "case.pst", text.substr(0, end), [&table](const std::string&, const SourcePlace&) { return table; }, notes);
    for (const ImportNote& note : notes.all()) require(note.lastLine >= note.place.line);
    (void)notes.text();
    (void)control;
  } catch (const FatalError& error) {
    require(error.message().starts_with("Error: Unable to import "));
    require(!error.detail().empty());
  }
  try {
    const ImportedCase made = importPestControl("case.pst", text.substr(0, end), SourceFiles("/nonexistent"));
    require(!setupText(made).empty());
    require(!made.parameters.empty() && !made.measures.empty() && !made.templates.empty());
  } catch (const FatalError& error) {
    require(error.message().starts_with("Error: Unable to import "));
  }
  return 0;
}
