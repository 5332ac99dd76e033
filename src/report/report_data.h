#pragma once

#include <cstddef>
#include <cstdint>
#include <limits>
#include <optional>
#include <string>
#include <vector>

#include "evaluation/evaluation_result.h"
#include "report/failure_reasons.h"
#include "report/report_front.h"
#include "report/report_glue.h"
#include "report/report_morris.h"
#include "report/report_posterior.h"
#include "report/report_repetitions.h"
#include "report/report_sobol.h"
#include "report/series_above.h"
#include "report/series_labels.h"
#include "run/results/run_record.h"
#include "run/results/scenario_series.h"
#include "run/results/series_table.h"
#include "run/results/validation_table.h"

namespace mirevo {

/// What a report shows. Unknown numbers are NaN; texts may hold any characters.

struct ReportedRun {
  std::string title;
  std::string setupFile;  ///< without its folder
  std::string setupName;
  std::string task;      ///< "scenarios", "sensitivity", "optimisation" or "uncertainty"
  std::string taskName;  ///< for a person
  std::string started;
  std::string ended;  ///< empty while it runs
  std::string reportMade;
  RunStage stage = RunStage::finished;
  std::string message;  ///< why it stopped; may be empty
  int planned = 0;      ///< evaluations; 0: unknown
  int repeats = 0;      ///< evaluations that have the result of an earlier one, without a model run
  std::string aggregation;
  std::string algorithm;   ///< the name of the search: "DDS"; empty: none
  std::string surrogate;   ///< empty: none
  int populationSize = 0;  ///< 0: none
  std::string periodStart;
  std::string periodEnd;
  std::optional<int> seed;
  std::vector<std::string> closingWarnings;  ///< warnings of the run that its closing lines have, too
  std::vector<std::string> notes;            ///< whole sentences on what is missing or old
};

struct ReportedParameter {
  std::string name;
  std::string comment;
  std::string equation;
  std::string kind;            ///< "variable", "fixed" or "dependent"
  std::string transformation;  ///< "none" or "logarithmic"
  bool isInteger = false;
  double lower = 0.0;
  double upper = 0.0;
  double start = 0.0;
  double best = std::numeric_limits<double>::quiet_NaN();
  std::string nearBound;  ///< "lower", "upper" or empty
};

struct ReportedMeasure {
  std::string name;
  std::string statistic;
  double weight = 1.0;
  std::string objective;  ///< empty: none
  bool isCriterion = false;
  double initial = std::numeric_limits<double>::quiet_NaN();
  double best = std::numeric_limits<double>::quiet_NaN();
};

struct ReportedObjective {
  std::string name;
  double initial = std::numeric_limits<double>::quiet_NaN();
  double best = std::numeric_limits<double>::quiet_NaN();
};

/// What a measure compares, and the values in its pairs.
struct ReportedComparison {
  std::string measure;
  RunRecord::Compared items;
  std::string counted;                         ///< which observations count and how; empty: all, alike
  MeasurePairs pairs;                          ///< of the best evaluation, else of the first successful run
  int number = 0;                              ///< of that evaluation
  std::optional<ValueSummary> simulatedFirst;  ///< by the first successful run, if `pairs` are those of the best
};

/// The evaluations in the order of their numbers, column by column; failed ones hold NaN.
struct ReportedEvaluations {
  std::vector<int> numbers;
  std::vector<bool> ok;
  std::vector<double> aggregate;
  std::vector<std::vector<double>> parameters;  ///< one column per variable parameter, model scale
  std::vector<std::vector<double>> measures;
  std::vector<std::vector<double>> objectives;
};

/// The 5 to 95 % band of an uncertainty analysis, one entry per time.
struct ReportedBand {
  std::string measure;
  SeriesLabel label;
  std::vector<std::int64_t> seconds;
  std::vector<float> observed;  ///< NaN where there is none
  std::vector<float> lower;
  std::vector<float> median;
  std::vector<float> upper;
  std::vector<float> runs;  ///< how many are behind the quantiles of each time; empty where the file does not say it
  std::size_t observationCount = 0;  ///< observations with a simulated value
  std::size_t insideCount = 0;       ///< those inside the band
  double meanWidth = 0.0;            ///< BandCoverage, at the observations; likewise
  double relativeWidth = 0.0;
  int fewestRuns = 0;    ///< of the times with a band
  int mostRuns = 0;      ///< where the file does not say it, the runs that succeeded
  bool isTotal = false;  ///< of what would be observed: with the errors
};

/// A parameter without a variance, and why.
struct ReportedLeftOut {
  std::string name;
  std::string reason;

  bool operator==(const ReportedLeftOut&) const = default;
};

/// The parameter covariance of a sensitivity analysis, or of a search by residuals, on the model scale, one entry per
/// parameter that has a variance.
struct ReportedCovariance {
  std::vector<std::string> names;
  std::vector<double> estimate;
  std::vector<double> standardDeviation;
  std::vector<double> lower95;
  std::vector<double> upper95;
  std::vector<std::vector<double>> correlation;
  std::string correlationFile;  ///< its name
  std::vector<ReportedLeftOut> leftOut;
  std::string lagText;  ///< what the correlation of successive residuals makes of the limits; empty: not said
};

struct ReportedSensitivity {
  std::vector<std::string> parameters;
  std::vector<std::string> outputs;  ///< output measures, then objective functions
  std::vector<std::vector<double>> derivatives;
  std::vector<std::vector<double>> dimensionless;
  std::vector<std::vector<std::string>> problems;  ///< why there is no derivative; empty if they are not known
  std::vector<double> composite;
  bool isOfObservations = false;  ///< the composite, rather than of the objective functions or output measures
  std::vector<std::string> ranking;
  bool hasBetterFit = false;     ///< another set fits better than that of the analysis
  std::vector<int> ofOtherSets;  ///< evaluations that are left out, as the setup has other sets for them
  std::optional<ReportedCovariance> covariance;
};

/// The distribution from which the values of a variable parameter were drawn.
struct ReportedDistribution {
  std::string text;               ///< "triangular, from 1 to 5, mode 2"
  std::vector<double> quantiles;  ///< at equal steps of the probability from half a step on, on the model scale
};

/// What a sample tells of its parameters, see algorithms/analyses/sample_sensitivity.
struct ReportedSampleSensitivity {
  std::vector<std::string> parameters;
  std::vector<std::string> outputs;
  std::vector<std::string> kinds;                     ///< of the outputs, "measure" or "objective"
  std::vector<std::vector<double>> rankCorrelations;  ///< a row of each parameter, a column of each output
  std::vector<std::vector<double>> firstOrder;
  std::vector<std::vector<double>> lower;
  std::vector<std::vector<double>> upper;
  std::vector<std::string> problems;  ///< of each output: why it has no first-order indices; empty if it has
  bool areCorrelated = false;         ///< the parameters
};

/// The evaluation period or a validation period.
struct ReportedPeriod {
  std::string name;
  std::string start;
  std::string end;
  std::int64_t first = 0;  ///< secondNumber() of its ends
  std::int64_t last = 0;
  bool isValidation = false;
};

struct ReportData {
  std::string program;
  ReportedRun run;
  std::vector<ReportedParameter> parameters;
  std::vector<ReportedMeasure> measures;
  std::vector<ReportedObjective> objectives;
  std::vector<ReportedComparison> comparisons;
  std::optional<ShownEvaluation> best;
  std::optional<int> initialNumber;    ///< the evaluation that gives the initial values of the measures
  bool isOfInitialParameters = false;  ///< it has the initial parameters; else it is the first that succeeded
  std::vector<FailureReason> failures;
  ReportedEvaluations evaluations;
  std::int64_t periodFirst = 0;  ///< secondNumber() of the ends of the evaluation period
  std::int64_t periodLast = 0;
  SeriesTable series;
  std::vector<std::optional<SeriesAbove>> above;  ///< one per shown series, or none at all
  std::vector<SeriesLabel> seriesLabels;          ///< one per series
  std::vector<std::size_t> seriesMeasures;        ///< one per series: the first measure of its pair, 0-based
  std::vector<ScenarioSeries> scenarioSeries;
  std::vector<std::string> runNames;    ///< of the evaluations, from the first on; empty where one has none
  std::vector<ReportedPeriod> periods;  ///< the evaluation period, and those of validation; empty without any of these
  ValidationTable validation;
  bool bestLacksValidation = false;      ///< the series of the best evaluation are there in the evaluation period alone
  std::vector<ShownSeries> wholeSeries;  ///< `series` from the first to the last period; empty without `periods`
  std::vector<ReportedBand> bands;
  std::optional<ReportedSensitivity> sensitivity;
  std::optional<ReportedCovariance> estimate;  ///< of the parameters that a search by residuals has found
  std::optional<ReportedFront> front;
  std::optional<ReportedRepetitions> repetitions;
  std::vector<ReportedScreening> morris;
  std::optional<ReportedSobol> sobol;
  std::optional<ReportedGlue> glue;
  std::optional<ReportedPosterior> posterior;
  std::vector<ReportedDistribution> distributions;  ///< one per variable parameter, or none at all
  std::optional<ReportedSampleSensitivity> sampleSensitivity;
  std::vector<std::string> summary;  ///< the closing lines of the result file
};

}  // namespace mirevo
