#include "measures/series_tables.h"

#include <algorithm>
#include <cassert>
#include <cmath>
#include <cstdint>
#include <filesystem>
#include <new>
#include <system_error>
#include <utility>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/fatal_error.h"
#include "common/files.h"
#include "common/text.h"
#include "measures/dates.h"
#include "measures/listing_series.h"
#include "measures/measure_statistics.h"
#include "measures/observed_series.h"
#include "measures/shown_above.h"
#include "measures/statistics.h"
#include "platform/series/series_reading.h"

namespace mirevo {
namespace {

/// Index of the file in the table, to which a new one is added. Names are case-sensitive; trailing blanks do not count.
/// A file that is read in two forms is there twice.
std::size_t indexOf(std::vector<SeriesReference>& table, const SeriesReference& reference) {
  const std::string_view name = trimTrailing(reference.fileName);
  const auto found = std::find_if(table.begin(), table.end(), [&](const SeriesReference& other) {
    return other.fileName == name && other.form == reference.form && other.listing == reference.listing;
  });
  if (found != table.end()) return static_cast<std::size_t>(found - table.begin());
  table.push_back(reference);
  table.back().fileName = name;
  return table.size() - 1;
}

std::vector<std::string> namesOf(const std::vector<SeriesReference>& files) {
  std::vector<std::string> names;
  names.reserve(files.size());
  for (const SeriesReference& file : files) names.push_back(file.fileName);
  return names;
}

std::unique_ptr<TimeSeriesObject> makeSeries(const std::string& path, std::string& reason,
                                             std::shared_ptr<SeriesReading> reading, const SeriesReference& reference) {
  if (reference.listing) return std::make_unique<ListingSeries>(reference.listing, std::move(reading));
  return createTimeSeriesObject(path, reason, std::move(reading), reference.form);
}

/// Why the results of a model run in this file cannot be used; empty when they can.
std::optional<std::string> findUnusable(TimeSeriesObject& series, const std::string& path, std::span<const int> items) {
  if (series.timeStepCount() < 1) return path + ": expected at least one time step, found none";
  for (const int item : items) {
    if (item < 1 || item > series.itemCount()) continue;  // the measures then end the run
    if (!series.getData(item)) return series.lastError();
    const std::span<const float> values = series.values(item);
    const std::optional<float> deleteValue = series.deleteValue();
    const bool hasValue =
        std::any_of(values.begin(), values.end(), [&](float value) { return !isMissing(value, deleteValue); });
    if (!hasValue) {
      return path + ": item No. " + std::to_string(item) + " (" + series.itemName(item) + ") has missing values only";
    }
  }
  return std::nullopt;
}

constexpr std::string_view kTooMuchMemory = "reading it takes more memory than there is";

/// Why the file of a model run cannot be opened, or its items in use not be read; empty, with `series`, when they can.
std::optional<std::string> tryOpen(const std::string& path, const SeriesReference& file, std::uintmax_t usualSize,
                                   std::span<const int> items, const std::shared_ptr<SeriesReading>& reading,
                                   std::unique_ptr<TimeSeriesObject>& series) {
  std::string reason;
  series = makeSeries(path, reason, reading, file);
  if (series && (file.listing || isTextSeries(path, file.form))) reason = faultOfSize(path, usualSize);
  if (!reason.empty()) return fmt::format("{}: {}", path, reason);
  try {
    series->willRead(items);
    if (!series->open(path)) return series->lastError();
    return findUnusable(*series, path, items);
  } catch (const std::bad_alloc&) {
    return fmt::format("{}: {}", path, kTooMuchMemory);
  }
}

std::uintmax_t sizeOf(const std::string& path) {
  std::error_code failed;
  const std::uintmax_t size = std::filesystem::file_size(path, failed);
  return failed ? 0 : size;
}

std::string itemText(const TimeSeriesObject& series, const SeriesReference& reference) {
  const std::string name = series.itemName(reference.itemNo);
  const std::string unit = series.itemUnit(reference.itemNo);
  const bool isInName = unit.empty() || name.find(unit) != std::string::npos;
  return fmt::format("item No. {} ({}{})", reference.itemNo, name, isInName ? "" : fmt::format(" [{}]", unit));
}

std::string spanText(const TimeSeriesObject& series) {
  const std::optional<DateRecord> start = series.startTime();
  if (!start || series.times().empty()) return {};
  const std::int64_t first = secondNumber(*start);
  return fmt::format(", {} to {}", formatDate(dateOfSecond(secondAfter(first, series.times().front()))),
                     formatDate(dateOfSecond(secondAfter(first, series.times().back()))));
}

}  // namespace

std::unique_ptr<TimeSeriesObject> openTimeSeries(const SeriesReference& reference,
                                                 std::shared_ptr<SeriesReading> reading, std::span<const int> items) {
  const std::string name(trimTrailing(reference.fileName));
  const std::string message = "Error opening TS object for file: " + name;
  std::string reason;
  std::unique_ptr<TimeSeriesObject> series = makeSeries(name, reason, std::move(reading), reference);
  if (!series) {
    fatalError("Error creating TS object for file: " + name,
               (reference.form.isGiven ? reference.formLocation : reference.fileLocation) + reason);
  }
  try {
    series->willRead(items);
    if (!series->open(name)) {
      std::error_code ignored;
      const bool isToBeWritten = reference.isOfModel && !std::filesystem::exists(name, ignored);
      fatalError(message,
                 reference.fileLocation + series->lastError() + series->firstLines() +
                     (isToBeWritten ? "\nThe model writes it: run the model once in its own folder, by its batch "
                                      "file, as what it writes must be there before the first run"
                                    : ""));
    }
  } catch (const std::bad_alloc&) {
    series.reset();
    fatalError(message, fmt::format("{}{}: {}", reference.fileLocation, name, kTooMuchMemory));
  }
  return series;
}

SeriesTables::SeriesTables() : reading_(std::make_shared<SeriesReading>()) {}

SeriesTables SeriesTables::MirevoTSobjectInit(std::span<const OutputMeasure> measures, const EvaluationPeriod& period,
                                              bool isForRuns) {
  SeriesTables tables;
  std::vector<SeriesReference> observations;  // that of the measure that names a file first
  std::vector<std::vector<int>> observationItems;
  for (const OutputMeasure& measure : measures) {
    if (measure.interfaceType != InterfaceType::timeSeries) {
      tables.observationIndex_.push_back(kNoSeries);
      tables.simulationIndex_.push_back(kNoSeries);
      continue;
    }
    tables.observationIndex_.push_back(indexOf(observations, measure.observation));
    observationItems.resize(observations.size());
    std::vector<int>& items = observationItems[tables.observationIndex_.back()];
    items.push_back(measure.observation.itemNo);
    for (const int item : measure.weighting.items()) items.push_back(item);
    tables.simulationIndex_.push_back(indexOf(tables.simulationFiles_, measure.simulation));
    tables.simulationItems_.resize(tables.simulationFiles_.size());
    tables.simulationItems_[tables.simulationIndex_.back()].push_back(measure.simulation.itemNo);
  }
  tables.observationNames_ = namesOf(observations);
  tables.simulationNames_ = namesOf(tables.simulationFiles_);
  // In ascending order, so that the columns of a text file are found quickly one after another.
  for (std::vector<std::vector<int>>* const table : {&tables.simulationItems_, &observationItems}) {
    for (std::vector<int>& items : *table) {
      std::sort(items.begin(), items.end());
      items.erase(std::unique(items.begin(), items.end()), items.end());
    }
  }
  const auto open = [&tables](const SeriesReference& file, std::span<const int> items) {
    auto series = openTimeSeries(file, tables.reading_, items);
    for (const std::string& doubt : series->doubts()) tables.warnings_.push_back(file.fileLocation + doubt);
    return series;
  };
  for (std::size_t i = 0; i < observations.size(); ++i) {
    tables.observations_.push_back(open(observations[i], observationItems[i]));
  }
  for (std::size_t i = 0; i < tables.simulationFiles_.size(); ++i) {
    tables.simulations_.push_back(open(tables.simulationFiles_[i], tables.simulationItems_[i]));
    tables.usualSizes_.push_back(sizeOf(tables.simulationNames_[i]));
    tables.toldDoubts_.push_back(tables.simulations_.back()->doubts().size());
  }
  tables.checkItems(measures, period, isForRuns);
  for (const OutputMeasure& measure : measures) {
    for (const std::string& doubt : requireShownAbove(measure, period)) {
      tables.addWarning(measure.shownAbove.fileLocation, doubt);
    }
  }
  tables.releaseSimulationFiles();
  return tables;
}

void SeriesTables::checkItems(std::span<const OutputMeasure> measures, const EvaluationPeriod& period, bool isForRuns) {
  needsPairs_.assign(measures.size(), false);
  comparedItems_.assign(measures.size(), {});
  for (std::size_t i = 0; i < measures.size(); ++i) {
    if (observationIndex_[i] == kNoSeries) continue;
    requireItem(observation(i), measures[i].observation);
    const ObservedSeries observed = readObservedSeries(i, measures[i], period, SeriesPrecision::single, observation(i));
    if (isForRuns) {
      requireCounting(observation(i), measures[i], period);
      checkSelection(observed, measures[i], period);
      requireObservations(observed, measures[i], period);
      requireDefined(observed, measures[i]);
    }
    comparedItems_[i].observed = itemText(observation(i), measures[i].observation) + spanText(observation(i)) +
                                 countedText(observed, measures[i], period);
    warnOfMarkers(observed, measures[i]);
    for (const std::string& doubt : doubtsOfCodes(observation(i), measures[i], period)) {
      addWarning(measures[i].weighting.qualityLocation, doubt);
    }
    warnOfDefaultItem(observation(i), measures[i].observation, observationNames_[observationIndex_[i]]);
    // Files in the base folder that have no time steps yet tell nothing about their columns.
    if (simulation(i).timeStepCount() < 1) {
      needsPairs_[i] = true;
      continue;
    }
    requireItem(simulation(i), measures[i].simulation);
    comparedItems_[i].simulated = itemText(simulation(i), measures[i].simulation);
    warnOfDefaultItem(simulation(i), measures[i].simulation, simulationNames_[simulationIndex_[i]]);
    warnOfLongSteps(simulation(i), measures[i]);
    needsPairs_[i] = hasPairs(measures[i], period, simulation(i), observation(i));
  }
}

std::string SeriesTables::countedText(const ObservedSeries& observed, const OutputMeasure& measure,
                                      const EvaluationPeriod& period) {
  if (period.warmUpDays == 0.0 && describeSelection(measure.selection).empty() && !measure.weighting.isUsed())
    return {};
  return fmt::format(", of which {} of {} observations in the evaluation period count", observed.values.size(),
                     observationCount(observed.measure, measure, period));
}

std::size_t SeriesTables::observationCount(std::size_t index, const OutputMeasure& measure,
                                           const EvaluationPeriod& period) {
  OutputMeasure all = measure;
  all.selection = {};
  all.weighting = {};
  return readObservedSeries(index, all, {period.start, period.end}, SeriesPrecision::single, observation(index))
      .values.size();
}

void SeriesTables::warnOfLongSteps(const TimeSeriesObject& simulation, const OutputMeasure& measure) {
  const std::span<const double> times = simulation.times();
  if (measure.timeMatch.kind != TimeMatch::mean || times.size() < 2) return;
  const double step = (times.back() - times.front()) / static_cast<double>(times.size() - 1);
  if (step <= 1.0 + kSameTimeDays) return;
  addWarning(measure.simulation.fileLocation,
             fmt::format("{} has steps of {} days on average: with Time_Match = 'mean' a day is compared with the one "
                         "step in it, which is no mean",
                         trimTrailing(measure.simulation.fileName), formatReal(step)));
}

void SeriesTables::requireObservations(const ObservedSeries& observed, const OutputMeasure& measure,
                                       const EvaluationPeriod& period) {
  if (!observed.values.empty()) return;
  TimeSeriesObject& series = observation(observed.measure);
  const std::string& name = observationNames_[observationIndex_[observed.measure]];
  const std::string& location = measure.observation.fileLocation;
  if (series.timeStepCount() < 1) {
    fatalError("Error getting time properties of TS object of file " + name, location + "the file has no time step");
  }
  fatalError(
      withNumber("Error: No simulated data found at observation times for item No. % in ", measure.simulation.itemNo) +
          simulationNames_[simulationIndex_[observed.measure]],
      fmt::format("{}{}\nthe evaluation period is {} to {}\n{}", location,
                  describeLackOfObservations(series, measure.observation.itemNo, name), formatDate(period.start),
                  formatDate(period.end), describeSpan(series, name)));
}

void SeriesTables::checkSelection(const ObservedSeries& observed, const OutputMeasure& measure,
                                  const EvaluationPeriod& period) {
  constexpr std::size_t kFew = 10;
  const std::size_t count = observed.values.size();
  const bool isSelected = period.warmUpDays > 0.0 || !describeSelection(measure.selection).empty();
  if (isSelected && count < kFew) {
    const std::size_t countOfAll = observationCount(observed.measure, measure, period);
    const std::string& location =
        measure.selection.location.empty() ? measure.observation.fileLocation : measure.selection.location;
    const std::string selected = fmt::format("{}: {}", observationNames_[observationIndex_[observed.measure]],
                                             describeSelected(measure, period, observation(observed.measure)));
    if (count == 0 && countOfAll > 0) {
      fatalError("Error: No observation counts for output measure " + measure.name, location + selected);
    }
    if (count < countOfAll) {
      addWarning(location, fmt::format("few observations count for output measure {}: {}",
                                       quotedForMessage(measure.name), selected));
    }
  }
  if (measure.timeMatch.kind != TimeMatch::mean || count == 0) return;
  const std::int64_t origin = secondNumber(observed.start);
  const auto dayOf = [origin](double days) { return dateOfSecond(secondAfter(origin, days))[date_field::kDay]; };
  const auto repeated = std::adjacent_find(observed.days.begin(), observed.days.end(),
                                           [&](double a, double b) { return b - a < 1.0 && dayOf(a) == dayOf(b); });
  if (repeated == observed.days.end()) return;
  addWarning(measure.observation.fileLocation,
             fmt::format("{} has several observations on one day, the first on {}: with Time_Match = 'mean' each is "
                         "compared with the mean of the whole day",
                         observationNames_[observationIndex_[observed.measure]],
                         formatDate(dateOfSecond(secondAfter(origin, *repeated)))));
}

void SeriesTables::requireDefined(const ObservedSeries& observed, const OutputMeasure& measure) {
  if (measure.transformation == ValueTransformation::none && !isCriterion(measure)) return;
  std::vector<double> rising(observed.values);
  for (std::size_t i = 0; i < rising.size(); ++i) rising[i] += static_cast<double>(i);
  if (observed.values.empty() || std::isfinite(valueAgainst(observed, observed.values, measure)) ||
      std::isfinite(valueAgainst(observed, rising, measure))) {
    return;
  }
  const std::string& name = observationNames_[observationIndex_[observed.measure]];
  const std::string what =
      fmt::format("the {} of item No. {} ({})", describeStatistic(measure), measure.observation.itemNo,
                  observation(observed.measure).itemName(measure.observation.itemNo));
  const bool areSame = std::ranges::all_of(observed.values, [&](double v) { return v == observed.values.front(); });
  // Those that a run compares may be fewer, but no others.
  if (areSame) {
    fatalError("Error: Statistic undefined for output measure " + measure.name,
               fmt::format("{}{}: {} in the evaluation period cannot be computed, whatever the model does{}",
                           measure.observation.fileLocation, name, what, describeUndefined(measure)));
  }
  addWarning(measure.observation.fileLocation,
             fmt::format("{}: {} cannot be computed where all of its observations are compared, and a model run that "
                         "does so has failed{}",
                         name, what, describeUndefined(measure)));
}

void SeriesTables::warnOfMarkers(const ObservedSeries& observed, const OutputMeasure& measure) {
  const double marker = usualMarkerAmong(observed.values);
  if (std::isnan(marker)) return;
  const std::string& name = observationNames_[observationIndex_[observed.measure]];
  const int item = measure.observation.itemNo;
  const auto count = std::count(observed.values.begin(), observed.values.end(), marker);
  const std::string warning = fmt::format(
      "{}: item No. {} ({}) is {} at {} of {} times in the evaluation period, and is compared there; if that marks "
      "missing values, {}",
      name, item, observation(observed.measure).itemName(item), static_cast<float>(marker), count,
      observed.values.size(), howToMarkMissing(name, static_cast<float>(marker), measure.observation.form));
  addWarning(measure.observation.fileLocation, warning);
}

void SeriesTables::warnOfDefaultItem(const TimeSeriesObject& series, const SeriesReference& reference,
                                     const std::string& name) {
  if (!reference.isDefaultItem || series.itemCount() <= 1) return;
  addWarning(reference.fileLocation,
             fmt::format("{} has several items, and item No. {} ({}) is compared, as the section has no Item_No:{}",
                         name, reference.itemNo, series.itemName(reference.itemNo), listItems(series)));
}

void SeriesTables::addWarning(const std::string& location, const std::string& text) {
  const bool isKnown = std::any_of(warnings_.begin(), warnings_.end(),
                                   [&text](const std::string& other) { return other.ends_with(text); });
  if (!isKnown) warnings_.push_back(location + text);
}

std::optional<std::string> SeriesTables::tryOpenSimulationFiles(std::span<const std::string> paths) {
  assert(paths.size() == simulationNames_.size());
  releaseSimulationFiles();
  for (std::size_t i = 0; i < paths.size(); ++i) {
    std::unique_ptr<TimeSeriesObject> series;
    if (auto unusable = tryOpen(std::string(trimTrailing(paths[i])), simulationFiles_[i], usualSizes_[i],
                                simulationItems_[i], reading_, series)) {
      releaseSimulationFiles();
      return unusable;
    }
    // Whether columns cut a number depends on how long it is, and header rows may be lacking.
    if (simulationFiles_[i].listing || simulationFiles_[i].form.isGiven) {
      const std::vector<std::string> doubts = series->doubts();
      for (; toldDoubts_[i] < doubts.size(); ++toldDoubts_[i]) {
        newDoubts_.push_back({i, toldDoubts_[i], doubts[toldDoubts_[i]]});
      }
    }
    simulations_.push_back(std::move(series));
  }
  return std::nullopt;
}

ReadingWatch& SeriesTables::watch() {
  return reading_->watch;
}

void SeriesTables::endHelper() {
  reading_->netcdf.end();
}

void SeriesTables::releaseSimulationFiles() {
  simulations_.clear();
}

TimeSeriesObject& SeriesTables::observation(std::size_t measure) {
  assert(observationIndex_.at(measure) != kNoSeries);
  return *observations_.at(observationIndex_.at(measure));
}

TimeSeriesObject& SeriesTables::simulation(std::size_t measure) {
  assert(simulationIndex_.at(measure) != kNoSeries);
  return *simulations_.at(simulationIndex_.at(measure));
}

}  // namespace mirevo
