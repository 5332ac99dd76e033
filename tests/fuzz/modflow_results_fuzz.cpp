// Any bytes as heads and as a budget of MODFLOW, and as a time discretization: no crash, and what is accepted keeps the
// promises of TimeSeriesObject.

#include <cstdint>
#include <string>

#include "file_of_bytes.h"
#include "platform/series/modflow_budget.h"
#include "platform/series/modflow_clock.h"
#include "platform/series/modflow_heads.h"
#include "series_promises.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string file = fileOfBytes(data, size);
  mirevo::ModflowHeads heads;
  requirePromises(heads, heads.open(file), file + ":");
  mirevo::ModflowBudget budget;
  requirePromises(budget, budget.open(file), file + ":");
  mirevo::ModflowClock clock;
  std::string reason;
  const std::string text(reinterpret_cast<const char*>(data), size);
  require(clock.parse("fuzz.tdis", text, reason) ? clock.secondOf(1.0).has_value() : reason.starts_with("fuzz.tdis:"));
  return 0;
}
