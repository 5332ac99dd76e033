#pragma once

#include <cstddef>
#include <span>
#include <string>
#include <vector>

#include "evaluation/evaluation_result.h"
#include "measures/output_measure.h"
#include "measures/validation_period.h"

namespace mirevo {

/// A successful evaluation, as far as calibration and validation compare it.
struct JudgedEvaluation {
  int number = 0;
  double aggregate = 0.0;  ///< NaN while it is not known
  std::vector<double> parameters;
  std::vector<double> measures;
  std::vector<double> validation;           ///< one per entry of validationTargets()
  std::vector<ValidationPairs> pairs = {};  ///< one per value; empty where they are not known
};

/// A measure in one period: of the best evaluation, and of the best tenth. NaN where there is none.
struct ValidationRange {
  double best = 0.0;
  double least = 0.0;
  double median = 0.0;
  double largest = 0.0;
};

/// Calibration and validation side by side.
struct ValidationTable {
  std::vector<std::string> periods;                  ///< "Calibration", then the names of the validation periods
  std::vector<std::size_t> measures;                 ///< 0-based, those that compare series
  std::vector<std::string> names;                    ///< of them
  std::vector<std::vector<ValidationRange>> values;  ///< one row per measure, one column per period
  int bestNumber = 0;
  std::size_t tenth = 0;           ///< evaluations in the best tenth; 0 where none is told apart
  std::size_t count = 0;           ///< successful evaluations of different sets, of which it is the tenth
  std::vector<std::string> lacks;  ///< one line per value that some evaluations have of fewer observations
};

/// `evaluations` in any order; the best tenth are those with the smallest aggregates, a parameter set counting once. It
/// is told apart if it has two evaluations or more and not all aggregates are equal. Empty without validation periods,
/// measures that compare series, or the evaluation `bestNumber`.
ValidationTable validationTable(std::span<const OutputMeasure> measures, std::span<const ValidationPeriod> periods,
                                std::span<const JudgedEvaluation> evaluations, int bestNumber);

/// The table as lines of text; none for an empty one.
std::vector<std::string> validationLines(const ValidationTable& table);

}  // namespace mirevo
