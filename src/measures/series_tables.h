#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include "measures/output_measure.h"
#include "platform/series/time_series_object.h"

namespace mirevo {

class ReadingWatch;
struct ObservedSeries;

/// What a measure compares, for people, as it was found at the start: "item No. 1 (discharge)". Empty if it compares no
/// series; the simulated item also if its file has no time step yet.
struct ComparedItems {
  std::string simulated;
  std::string observed;  ///< with the time span of its file
};

/// Something in a file that a model run wrote that may not mean what it is read as.
struct FileDoubt {
  std::size_t file = 0;   ///< which one of those that model runs write
  std::size_t place = 0;  ///< among the doubts about that file, the same for the same doubt about another run's
  std::string text;       ///< one line for the log
};

/// The opened time-series files of the run: every distinct observation file, open for the whole run, and every distinct
/// simulation file, open only while the measures of one evaluation are computed.
class SeriesTables final {
 public:
  /// Without files.
  SeriesTables();
  /// Opens every observation file and, as a check, every simulation file, which it releases again. Measures of
  /// interface type 1 have no series. Item numbers that a file does not have and observations that cannot be read are
  /// also found here, before the first model run. Throws FatalError with the fixed texts.
  /// `isForRuns`: model runs follow, so that each measure needs observations in the period.
  static SeriesTables MirevoTSobjectInit(std::span<const OutputMeasure> measures, const EvaluationPeriod& period,
                                         bool isForRuns = true);

  /// Opens the simulation files of one evaluation: `paths[i]` is the copy of simulationFileNames()[i] in the slot's
  /// folder. Files still open are released first. Returns one line for a person, with all files released, when a file
  /// cannot be opened or has no time step, when an item in use cannot be read or has missing values only, when the time
  /// of watch() is over, and when a file takes too much memory or is far larger than the one that was found at the
  /// start; empty when the files are open. An item number that a file does not have is left to the measures, which end
  /// the run.
  std::optional<std::string> tryOpenSimulationFiles(std::span<const std::string> paths);
  void releaseSimulationFiles();
  /// What is doubtful in text files that were opened for evaluations, and was not in one before; told once.
  std::vector<FileDoubt> takeDoubts() { return std::exchange(newDoubts_, {}); }
  /// Limits how long files are read.
  ReadingWatch& watch();
  /// Ends the process that reads files of some formats, if there is one.
  void endHelper();

  const std::vector<std::string>& observationFileNames() const { return observationNames_; }
  /// A listing that several measures read in different ways is there several times.
  const std::vector<std::string>& simulationFileNames() const { return simulationNames_; }

  /// The file of the measure with this 0-based index; simulation() may be called only between open and release.
  TimeSeriesObject& observation(std::size_t measure);
  TimeSeriesObject& simulation(std::size_t measure);
  /// Which of simulationFileNames() that is.
  std::size_t simulationIndex(std::size_t measure) const { return simulationIndex_.at(measure); }
  const ComparedItems& comparedItems(std::size_t measure) const { return comparedItems_.at(measure); }
  /// What seems to be meant in another way in files as they were found at the start, with their locations in the setup.
  const std::vector<std::string>& warnings() const { return warnings_; }
  /// Whether a model run without a simulated value for any observation of the measure in the period is the run's own
  /// fault and not the setup's: the file in the base folder has such values, or has no time steps yet and there are
  /// observations in the period. Told before the first model run, so that it depends on no other run.
  bool needsPairs(std::size_t measure) const { return needsPairs_.at(measure); }

 private:
  static constexpr std::size_t kNoSeries = static_cast<std::size_t>(-1);  ///< index of a measure of interface type 1

  /// Throws FatalError, as the first model run would, if there are none.
  void requireObservations(const ObservedSeries& observed, const OutputMeasure& measure,
                           const EvaluationPeriod& period);
  /// Throws FatalError if the settings that leave observations out leave none; warns of few, and of observations that
  /// share a simulated day.
  void checkSelection(const ObservedSeries& observed, const OutputMeasure& measure, const EvaluationPeriod& period);
  /// Throws FatalError if the statistic cannot be computed for these observations, whatever the model does; warns if it
  /// cannot be where all of them are compared.
  void requireDefined(const ObservedSeries& observed, const OutputMeasure& measure);
  /// ", of which 300 of 365 observations in the evaluation period count"; empty if all do, unless they are missing.
  std::string countedText(const ObservedSeries& observed, const OutputMeasure& measure, const EvaluationPeriod& period);
  /// Of the measure with this index in the evaluation period, whether they count or not.
  std::size_t observationCount(std::size_t index, const OutputMeasure& measure, const EvaluationPeriod& period);
  /// Where daily means are to be made of steps that are longer.
  void warnOfLongSteps(const TimeSeriesObject& simulation, const OutputMeasure& measure);
  /// Of a file with several items of which the setup names none.
  void warnOfDefaultItem(const TimeSeriesObject& series, const SeriesReference& reference, const std::string& name);
  /// Unless it has been given with another location, as for measures that compare the same item.
  void addWarning(const std::string& location, const std::string& text);
  /// If observations are a usual marker of missing values that is not marked as one.
  void warnOfMarkers(const ObservedSeries& observed, const OutputMeasure& measure);
  void checkItems(std::span<const OutputMeasure> measures, const EvaluationPeriod& period, bool isForRuns);

  std::vector<std::string> observationNames_;
  std::vector<std::string> simulationNames_;
  std::vector<SeriesReference> simulationFiles_;  ///< one per name: that of the measure that names it first
  std::vector<std::size_t> observationIndex_;     ///< one per measure, 0-based
  std::vector<std::size_t> simulationIndex_;
  std::vector<bool> needsPairs_;                   ///< one per measure
  std::vector<ComparedItems> comparedItems_;       ///< one per measure
  std::vector<std::vector<int>> simulationItems_;  ///< one per simulation file: the item numbers in use
  std::vector<std::size_t> toldDoubts_;            ///< one per simulation file: how many were told
  std::vector<FileDoubt> newDoubts_;
  std::vector<std::uintmax_t> usualSizes_;  ///< one per simulation file: as it was found at the start
  std::shared_ptr<SeriesReading> reading_;
  std::vector<std::unique_ptr<TimeSeriesObject>> observations_;
  std::vector<std::unique_ptr<TimeSeriesObject>> simulations_;
  std::vector<std::string> warnings_;
};

/// Creates and opens the file of the reference, of which `items` will be read; `reading` may be null. Throws FatalError
/// with "Error creating TS object for file: " or "Error opening TS object for file: " and the name; the detail holds
/// the location.
std::unique_ptr<TimeSeriesObject> openTimeSeries(const SeriesReference& reference,
                                                 std::shared_ptr<SeriesReading> reading = nullptr,
                                                 std::span<const int> items = {});

}  // namespace mirevo
