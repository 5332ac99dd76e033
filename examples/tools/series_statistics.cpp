// How well a simulated series fits an observed one over a period:
//
//   series_statistics SIMULATED OBSERVED START END [SIMULATED_ITEM [OBSERVED_ITEM]]
//
// prints one line, for example `3287 values, NSE 0.871, KGE 0.823, RMSE 11.67, volume +6.0 %`. The file formats are
// those of the program itself; missing observations are left out. START and END are days such as 1991-01-01, both
// included. Items count from 1, the default.

#include <cstdio>
#include <exception>
#include <memory>
#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "common/text.h"
#include "measures/dates.h"
#include "measures/series_tables.h"
#include "platform/series/time_series_object.h"
#include "tools/goodness_of_fit.h"
#include "tools/program_questions.h"

namespace mirevo::examples {
namespace {

constexpr ProgramHelp kHelp = {
    "series_statistics", "SIMULATED OBSERVED START END [SIMULATED_ITEM [OBSERVED_ITEM]]",
    "Prints how well a simulated series fits an observed one from START to END, days such as 1991-01-31."};

/// Reads a day such as 2001-01-31.
DateRecord parseDay(const std::string& text) {
  const auto year = parseInteger(text.substr(0, 4));
  const auto month = text.size() == 10 ? parseInteger(text.substr(5, 2)) : std::nullopt;
  const auto day = text.size() == 10 ? parseInteger(text.substr(8, 2)) : std::nullopt;
  if (!year || !month || !day) throw std::runtime_error(text + ": expected a day such as 2001-01-31");
  const DateRecord date{*year, *month, *day};
  date_check(date, kDateFieldCount);
  return date;
}

struct Item {
  std::unique_ptr<TimeSeriesObject> series;
  int number = 1;
};

Item openItem(const std::string& fileName, int number) {
  Item item{openTimeSeries(SeriesReference{.fileName = fileName}), number};
  if (!item.series->startTime()) throw std::runtime_error(fileName + ": holds no time step");
  if (number < 1 || number > item.series->itemCount()) throw std::runtime_error(fileName + ": has no such item");
  if (!item.series->getData(number)) throw std::runtime_error(item.series->lastError());
  return item;
}

struct Pairs {
  std::vector<double> simulated;
  std::vector<double> observed;
};

/// The observations of the period that are not missing and the simulated values at their times.
Pairs pairUp(const Item& simulated, const Item& observed, const DateRecord& start, const DateRecord& end) {
  const DateRecord origin = *observed.series->startTime();
  const double first = daysSince(origin, start);
  const double beyond = daysSince(origin, end) + 1.0;  // the last day is included whole
  const double shift = daysSince(*simulated.series->startTime(), origin);
  const auto times = observed.series->times();
  Pairs pairs;
  for (const double time : times) {
    if (time < first || time >= beyond) continue;
    const auto o = valueAt(*observed.series, observed.number, time);
    if (!o) continue;
    const auto s = valueAt(*simulated.series, simulated.number, time + shift);
    if (!s) throw std::runtime_error("the simulated series does not cover the observations of the period");
    pairs.observed.push_back(*o);
    pairs.simulated.push_back(*s);
  }
  if (pairs.observed.size() < 2) throw std::runtime_error("fewer than two observations in the period");
  return pairs;
}

int itemNumber(int argc, char** argv, int index) {
  return index < argc ? parseInteger(argv[index]).value_or(0) : 1;
}

void run(int argc, char** argv) {
  const Item simulated = openItem(argv[1], itemNumber(argc, argv, 5));
  const Item observed = openItem(argv[2], itemNumber(argc, argv, 6));
  const Pairs pairs = pairUp(simulated, observed, parseDay(argv[3]), parseDay(argv[4]));
  const GoodnessOfFit fit = goodnessOfFit(pairs.simulated, pairs.observed);
  fmt::print("{} values, NSE {:.3f}, KGE {:.3f}, RMSE {:.2f}, volume {:+.1f} %\n", pairs.observed.size(), fit.nse,
             fit.kge, fit.rmse, 100.0 * fit.volumeBias);
}

}  // namespace
}  // namespace mirevo::examples

int main(int argc, char** argv) {
  constexpr auto kHelp = mirevo::examples::kHelp;
  if (mirevo::examples::answersQuestion(argc, argv, kHelp)) return 0;
  if (argc < 5 || argc > 7) return mirevo::examples::refuseArguments(kHelp);
  try {
    mirevo::examples::run(argc, argv);
  } catch (const mirevo::FatalError& error) {
    std::fprintf(stderr, "series_statistics: %s\n%s\n", error.what(), error.detail().c_str());
    return 1;
  } catch (const std::exception& error) {
    std::fprintf(stderr, "series_statistics: %s\n", error.what());
    return 1;
  }
  return 0;
}
