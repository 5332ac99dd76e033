#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "evaluation/evaluation_result.h"
#include "evaluation/model_description.h"
#include "evaluation/run_comparison.h"
#include "measures/measure_file.h"
#include "measures/measure_statistics.h"
#include "measures/objective_functions.h"
#include "measures/observed_series.h"
#include "measures/series_tables.h"

namespace mirevo {

/// Where a model run leaves what is read of it.
struct OutputFiles {
  std::string folder;                        ///< the process folder
  std::vector<std::string> simulationFiles;  ///< in the order of OutputReader::simulationFileNames()
  std::string measureFile;                   ///< empty when there is none
  std::vector<std::string> furtherMeasureFiles = {};
};

/// Turns the files that a model run has left into a result: its measures, objective functions and aggregate, or why it
/// has none that can be used.
class OutputReader final {
 public:
  /// Opens the observed series and examines the model's output in the base folder. Both must outlive the reader. Throws
  /// FatalError.
  OutputReader(const ModelDescription& description, const ObjectiveAggregator& aggregator);

  /// From now on a model run with less than the least share of its pairs is a failed evaluation.
  void setStandard(RunStandard standard) { standard_ = std::move(standard); }

  /// The result of a batch that ended well; its number is 0, and it has no output of the batch. Leaves the simulated
  /// series open. Faults of the model run give a failed result; throws FatalError if the setup or the observations are
  /// at fault.
  EvaluationResult read(const OutputFiles& files);
  /// Whether the first successful run may show that the result is no whole one, see RunComparison::judge().
  bool mayBeCutOff(const EvaluationResult& result) const;
  /// The simulated series of shownMeasures(), of the run that was read last.
  std::vector<PeriodSeries> readShownSeries();
  /// Closes the simulated series.
  void release() { series_.releaseSimulationFiles(); }
  /// Ends a process that reads files for this one, if there is one.
  void endHelper() { series_.endHelper(); }
  /// Limits how long files are read.
  ReadingWatch& watch() { return series_.watch(); }

  /// A result with the failed-run value in every field.
  EvaluationResult failedResult(EvaluationFailure failure) const;

  const std::vector<std::string>& simulationFileNames() const { return series_.simulationFileNames(); }
  /// One per output measure.
  const std::vector<MeasureSource>& sources() const { return sources_; }
  /// The observations of every measure of interface type 0, with the steps of its simulated series if values are kept
  /// there; empty unless simulated values are kept.
  const std::vector<ObservedSeries>& observedSeries() const { return observedSeries_; }
  /// Their observations in validation periods, on which nothing depends; empty unless simulated values are kept.
  const std::vector<ValidationObservations>& validationObservations() const { return validationObservations_; }
  /// The measures whose simulated series a result may hold, 0-based: one per pair of series that is compared. Series
  /// that are shown begin and end with the first and the last of the evaluation and validation periods.
  const std::vector<std::size_t>& shownMeasures() const { return shownMeasures_; }
  /// The observed series of each of shownMeasures().
  std::vector<PeriodSeries> readShownObservations();
  /// The first observation, of the series of a measure, behind the end of the period on the same day if that end is the
  /// beginning of the day; its secondNumber().
  std::optional<std::int64_t> observationLeftOut(std::size_t measure);
  /// A comparison of model runs with the first successful one, for the evaluations of a run.
  RunComparison runComparison() const;
  /// What the user should know of the files as they were found.
  const std::vector<std::string>& warnings() const { return warnings_; }

 private:
  /// A measure in a validation period.
  struct Validated {
    std::size_t index = 0;        ///< of the measure
    std::size_t periodIndex = 0;  ///< of the validation period
    OutputMeasure measure;
    EvaluationPeriod period;
  };
  void tryInstructions(const std::string& listing, const InstructionFile& instructions);
  void prepareValidation();
  /// Fills in the measures in the validation periods.
  void validate(EvaluationResult& result);
  static std::optional<EvaluationFailure> findMissing(const OutputFiles& files);
  /// The numbers of all output-measure files; empty, with a reason, if one cannot be used.
  std::optional<MeasureFile> readNumbers(const OutputFiles& files, std::string& reason,
                                         std::vector<std::string>& doubts);
  /// Fills in the measures and simulated values and leaves the series open; returns a failure if the model's output
  /// cannot be used.
  std::optional<EvaluationFailure> readMeasures(const OutputFiles& files, EvaluationResult& result);
  std::optional<EvaluationFailure> readSeriesMeasure(const std::string& path, std::size_t measure, const FileForm& form,
                                                     EvaluationResult& result);
  std::optional<EvaluationFailure> findLackOfPairs(std::size_t measure, std::size_t count) const;
  void noteUnusedObservations(std::size_t measure, const MeasureStatistics& statistics, EvaluationResult& result) const;

  const ModelDescription& description_;
  const ObjectiveAggregator& aggregator_;
  std::vector<MeasureSource> sources_;
  SeriesTables series_;
  std::vector<std::size_t> shownMeasures_;
  EvaluationPeriod shownPeriod_;
  std::vector<Validated> validated_;
  std::vector<std::string> warnings_;
  std::size_t numbersNeeded_ = 0;             ///< in the output-measure files
  std::vector<std::uintmax_t> usualNumbers_;  ///< sizes of these files as they were found at the start
  bool hasToldDoubts_ = false;                ///< what the instructions read of a listing and may not mean
  std::vector<ObservedSeries> observedSeries_;
  std::vector<ValidationObservations> validationObservations_;
  RunStandard standard_;
};

}  // namespace mirevo
