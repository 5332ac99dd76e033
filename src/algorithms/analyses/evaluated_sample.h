#pragma once

#include <cstddef>
#include <functional>
#include <span>
#include <string>
#include <vector>

#include "evaluation/evaluation_result.h"

namespace mirevo {

/// Evaluated sets, column by column, so that 100,000 of them take little more room than their numbers. Failed ones have
/// no values of measures and objective functions (NaN).
struct EvaluatedSample {
  std::vector<int> numbers;
  std::vector<bool> ok;
  std::vector<std::vector<double>> parameters;  ///< a column per variable parameter, model scale
  std::vector<std::vector<double>> measures;    ///< a column per output measure; likewise the following
  std::vector<std::vector<double>> objectives;
  std::vector<std::vector<double>> validation;

  std::size_t size() const { return numbers.size(); }
  void add(std::span<const double> parameterValues, const EvaluationResult& result);
};

/// Simulated values of these evaluations from index `first` on, `count` of each; those with the same index side by
/// side.
using SimulatedColumns =
    std::function<std::vector<double>(std::span<const int> numbers, std::size_t first, std::size_t count)>;

/// What is on disk of a run that was made before.
struct EarlierSample {
  EvaluatedSample sample = {};
  SimulatedColumns simulatedColumns = {};  ///< empty: there are none for the observations of this run
  std::vector<std::string> notes = {};     ///< for the log
  std::vector<std::string> warnings = {};
  bool isOfDistributions = true;  ///< drawn from distributions; not the sets of a search, a design or Markov chains
  bool areCorrelated = false;     ///< and these were correlated
};

}  // namespace mirevo
