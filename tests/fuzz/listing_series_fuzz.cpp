// Any bytes as an instruction file, behind the first NUL a table of times and the form of dates, and behind the second
// the listing: no crash, a fault with its keyword where there is no series, and the promises of TimeSeriesObject.

#include <algorithm>
#include <cstdint>
#include <string>
#include <string_view>

#include "measures/listing_series.h"
#include "series_promises.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  std::string_view rest(reinterpret_cast<const char*>(data), size);
  const auto next = [&rest] {
    const std::size_t end = std::min(rest.find('\0'), rest.size());
    const std::string_view part = rest.substr(0, end);
    rest.remove_prefix(std::min(end + 1, rest.size()));
    return part;
  };
  const std::string_view instructions = next();
  const std::string_view times = next();
  mirevo::ListingSettings byTable{.instructionFile = "i.ins", .timesFile = "t.csv"};
  mirevo::ListingSettings byDates{.instructionFile = "i.ins", .dates = std::string(times)};
  mirevo::ListingSettings bySteps{
      .instructionFile = "i.ins", .start = mirevo::DateRecord{2001, 1, 1}, .stepHours = 0.5};
  for (const mirevo::ListingSettings& settings : {byTable, byDates, bySteps}) {
    mirevo::ListingFault fault;
    const auto form = mirevo::ListingForm::make(settings, instructions, times, fault);
    require(form != nullptr || (!fault.keyword.empty() && !fault.text.empty()));
    if (!form) continue;
    require(!form->series().empty());
    mirevo::ListingSeries series(form);
    requirePromises(series, series.parse("fuzz.lst", rest), "fuzz.lst:");
  }
  return 0;
}
