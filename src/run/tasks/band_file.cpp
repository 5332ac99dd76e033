#include "run/tasks/band_file.h"

#include <cmath>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/files.h"
#include "run/results/record_file.h"
#include "run/results/result_file.h"

namespace mirevo {
namespace {

/// With the digits of a series' 32-bit values.
std::string cell(double value) {
  return std::isfinite(value) ? fmt::format("{}", static_cast<float>(value)) : "NaN";
}

}  // namespace

void writeBandFile(const std::string& path, const std::string& title, const ObservedSeries& observed,
                   const SeriesBand& band) {
  constexpr double kSecondsPerDay = 86400.0;
  std::string text = fmt::format("# Band of {}\ntime,observed,5 %,50 %,95 %\n", columnName(title));
  const std::int64_t origin = secondNumber(observed.start);
  for (std::size_t t = 0; t < observed.days.size(); ++t) {
    const DateRecord time = dateOfSecond(origin + std::llround(observed.days[t] * kSecondsPerDay));
    text += fmt::format("{},{},{},{},{}\n", formatDate(time), cell(observed.values[t]), cell(band.lower[t]),
                        cell(band.median[t]), cell(band.upper[t]));
  }
  std::string reason;
  if (readTextFile(path, reason) == text) return;  // of a run that is walked through again
  keepEarlierFile(path);
  RecordFile file;
  file.open(path);
  file.append(text);
  file.close();
}

}  // namespace mirevo
