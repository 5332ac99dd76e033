#pragma once

#include <algorithm>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "measures/instruction_file.h"
#include "measures/kept_steps.h"
#include "measures/measure_file.h"
#include "measures/objective_functions.h"
#include "measures/output_measure.h"
#include "measures/validation_period.h"
#include "parameters/template_file.h"

namespace mirevo {

/// All that is needed to turn a parameter set into a result, except the parameters themselves. File names are absolute.
struct ModelDescription {
  std::string baseFolder;
  std::string fileTag;  ///< name of the setup; part of the names of converted templates in process folders
  std::vector<ParameterFileItem> parameterFiles;
  std::vector<OutputMeasure> measures;
  std::string measureFile;  ///< output-measure file; empty when no measure is of interface type 1
  std::shared_ptr<const InstructionFile> instructions = {};  ///< where its numbers are; null: in free format
  std::vector<MeasureFileSource> furtherMeasureFiles = {};   ///< behind the first one
  EvaluationPeriod period;
  std::vector<ValidationPeriod> validationPeriods;
  double minimumCoverage = 0.0;  ///< share of the first successful run's pairs below which a run fails
  std::vector<ObjectiveFunction> objectives;
  std::vector<std::string> savedFiles;  ///< files kept from every model run
  std::string savedFolder;              ///< where they are kept
  std::string failedFolderPrefix;       ///< path of a failed run's folder, without the evaluation number that follows
  int runsAtOnce = 1;                 ///< model runs side by side, of all ranks, whose room on the disk is left to them
  int shownRuns = 0;                  ///< evaluations, the first ones, whose results hold their series in any case
  bool reusesResults = false;         ///< a set that has succeeded is not run again
  bool hasShownSeries = true;         ///< results that may be shown hold their series
  bool isForRuns = true;              ///< model runs follow
  bool computeExactMeasures = false;  ///< results hold the measures in 64 bits, too
  bool keepSimulatedValues = false;   ///< results hold the simulated values at the observation times
  SeriesPrecision keptPrecision = SeriesPrecision::single;
  std::optional<KeptSteps> keptSteps = {};  ///< they are kept at simulated steps, too

  /// Whether the setup says how results are to be read, so that what they make doubtful is told, once.
  bool saysHowToRead() const {
    return instructions || std::any_of(measures.begin(), measures.end(), [](const OutputMeasure& measure) {
             return measure.simulation.listing || measure.simulation.form.isGiven;
           });
  }
};

}  // namespace mirevo
