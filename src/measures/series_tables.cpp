#include "measures/series_tables.h"

#include <algorithm>
#include <cassert>
#include <utility>

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "common/text.h"
#include "measures/measure_statistics.h"
#include "measures/observed_series.h"

namespace mirevo {
namespace {

/// Index of the name in the table, to which a new name is added. Names are case-sensitive; trailing blanks do not
/// count.
std::size_t indexOf(std::vector<std::string>& table, std::string_view name) {
  const std::string_view trimmed = trimTrailing(name);
  const auto found = std::find(table.begin(), table.end(), trimmed);
  if (found != table.end()) return static_cast<std::size_t>(found - table.begin());
  table.emplace_back(trimmed);
  return table.size() - 1;
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

}  // namespace

std::unique_ptr<TimeSeriesObject> openTimeSeries(const std::string& fileName, const std::string& setupLocation) {
  const std::string name(trimTrailing(fileName));
  std::string reason;
  std::unique_ptr<TimeSeriesObject> series = createTimeSeriesObject(name, reason);
  if (!series) fatalError("Error creating TS object for file: " + name, setupLocation + reason);
  if (!series->open(name)) fatalError("Error opening TS object for file: " + name, setupLocation + series->lastError());
  return series;
}

SeriesTables SeriesTables::MirevoTSobjectInit(std::span<const OutputMeasure> measures, const EvaluationPeriod& period) {
  SeriesTables tables;
  std::vector<std::string> observationLocations;  // of the measure that names a file first
  std::vector<std::string> simulationLocations;
  for (const OutputMeasure& measure : measures) {
    if (measure.interfaceType != InterfaceType::timeSeries) {
      tables.observationIndex_.push_back(kNoSeries);
      tables.simulationIndex_.push_back(kNoSeries);
      continue;
    }
    tables.observationIndex_.push_back(indexOf(tables.observationNames_, measure.observation.fileName));
    if (tables.observationNames_.size() > observationLocations.size()) {
      observationLocations.push_back(measure.observation.fileLocation);
    }
    tables.simulationIndex_.push_back(indexOf(tables.simulationNames_, measure.simulation.fileName));
    if (tables.simulationNames_.size() > simulationLocations.size()) {
      simulationLocations.push_back(measure.simulation.fileLocation);
    }
    tables.simulationItems_.resize(tables.simulationNames_.size());
    tables.simulationItems_[tables.simulationIndex_.back()].push_back(measure.simulation.itemNo);
  }
  // In ascending order, so that the columns of a text file are found quickly one after another.
  for (std::vector<int>& items : tables.simulationItems_) {
    std::sort(items.begin(), items.end());
    items.erase(std::unique(items.begin(), items.end()), items.end());
  }
  const auto open = [&tables](const std::string& name, const std::string& location) {
    auto series = openTimeSeries(name, location);
    if (const std::string doubt = series->doubt(); !doubt.empty()) tables.warnings_.push_back(location + doubt);
    return series;
  };
  for (std::size_t i = 0; i < observationLocations.size(); ++i) {
    tables.observations_.push_back(open(tables.observationNames_[i], observationLocations[i]));
  }
  for (std::size_t i = 0; i < simulationLocations.size(); ++i) {
    tables.simulations_.push_back(open(tables.simulationNames_[i], simulationLocations[i]));
  }
  tables.checkItems(measures, period);
  tables.releaseSimulationFiles();
  return tables;
}

void SeriesTables::checkItems(std::span<const OutputMeasure> measures, const EvaluationPeriod& period) {
  needsPairs_.assign(measures.size(), false);
  for (std::size_t i = 0; i < measures.size(); ++i) {
    if (observationIndex_[i] == kNoSeries) continue;
    requireItem(observation(i), measures[i].observation);
    // Files in the base folder that have no time steps yet tell nothing about their columns.
    if (simulation(i).timeStepCount() < 1) {
      const ObservedSeries observed =
          readObservedSeries(i, measures[i], period, SeriesPrecision::single, observation(i));
      needsPairs_[i] = !observed.values.empty();
      continue;
    }
    requireItem(simulation(i), measures[i].simulation);
    needsPairs_[i] = observation(i).timeStepCount() > 0 && hasPairs(measures[i], period, simulation(i), observation(i));
  }
}

void SeriesTables::openSimulationFiles(std::span<const std::string> paths) {
  assert(paths.size() == simulationNames_.size());
  releaseSimulationFiles();
  for (const std::string& path : paths) simulations_.push_back(openTimeSeries(path));
}

std::optional<std::string> SeriesTables::tryOpenSimulationFiles(std::span<const std::string> paths) {
  assert(paths.size() == simulationNames_.size());
  releaseSimulationFiles();
  for (std::size_t i = 0; i < paths.size(); ++i) {
    const std::string path(trimTrailing(paths[i]));
    std::string reason;
    std::unique_ptr<TimeSeriesObject> series = createTimeSeriesObject(path, reason);
    std::optional<std::string> unusable;
    if (!series) {
      unusable = fmt::format("{}: {}", path, reason);
    } else if (!series->open(path)) {
      unusable = series->lastError();
    } else {
      unusable = findUnusable(*series, path, simulationItems_[i]);
    }
    if (unusable) {
      releaseSimulationFiles();
      return unusable;
    }
    simulations_.push_back(std::move(series));
  }
  return std::nullopt;
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
