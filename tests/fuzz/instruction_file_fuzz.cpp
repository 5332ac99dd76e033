// Any bytes as an instruction file and, behind the first NUL, the listing that it reads: no crash, one finite number
// per name, and a reason with a place where there is none.

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <string>
#include <string_view>

#include "measures/instruction_file.h"
#include "require.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string_view text(reinterpret_cast<const char*>(data), size);
  const std::size_t end = std::min(text.find('\0'), text.size());
  std::string reason;
  const auto file = mirevo::InstructionFile::parse("i.ins", text.substr(0, end), reason);
  require(file.has_value() || reason.starts_with("i.ins:"));
  if (!file) return 0;
  require(!file->names().empty());
  for (std::size_t i = 0; i < file->names().size(); ++i) require(file->placeOf(file->names()[i]) == i);
  const auto values = file->read("out.lst", text.substr(std::min(end + 1, text.size())), reason);
  require(values.has_value() || reason.starts_with("out.lst:"));
  if (!values) return 0;
  require(values->size() == file->names().size());
  for (const double value : *values) require(std::isfinite(value));
  return 0;
}
