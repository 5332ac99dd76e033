// Any text as a table of failures, or of output files that were not kept: what was read is written and read back the
// same.

#include <cstdint>
#include <string_view>

#include "require.h"
#include "run/results/failure_table.h"
#include "run/results/unkept_files.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string_view text(reinterpret_cast<const char*>(data), size);
  const auto rows = mirevo::readFailureTable(text);
  std::string written = mirevo::failureTableHead({});
  for (const mirevo::FailureRow& row : rows) written += mirevo::failureRowText(row);
  const auto again = mirevo::readFailureTable(written);
  require(again.size() == rows.size());
  for (std::size_t i = 0; i < rows.size(); ++i) {
    const mirevo::EvaluationFailure& failure = rows[i].failure;
    require(again[i].number == rows[i].number && again[i].failure.kind == failure.kind);
    require(again[i].failure.reason == failure.reason && again[i].failure.lastOutput == failure.lastOutput);
  }
  const std::string unkept = mirevo::unkeptTableText({}, mirevo::readUnkeptTable(text));
  require(mirevo::unkeptTableText({}, mirevo::readUnkeptTable(unkept)) == unkept);
  return 0;
}
