#pragma once

#include <cstddef>
#include <optional>
#include <set>
#include <span>
#include <string>
#include <vector>

#include "common/parameter_set.h"
#include "evaluation/evaluation_result.h"
#include "parameters/parameter_fields.h"
#include "parameters/search_space.h"

namespace mirevo {

/// Notices that a model ignores its parameters: all its successful runs have the same measures, or the same value of
/// some, though the values that it got differ. What it finds depends on the batches alone, not on the order in which
/// model runs end.
class EqualMeasures final {
 public:
  /// Never finds anything.
  EqualMeasures() = default;
  /// The fields of the parameters; the names of the measures, empty for those that no model can change, of the
  /// parameter files and of the files from which the measures are read.
  EqualMeasures(SearchSpace space, ParameterFields fields, std::vector<std::string> measures,
                std::vector<std::string> parameterFiles, std::vector<std::string> resultFiles);

  /// Takes a complete batch; returns a warning, once in a run, if measures have not changed by the end of a sample,
  /// of twenty successful runs or, with `isLast`, of the run. If others have, it waits until every value has differed
  /// that the model gets. `repeats`: the indices of sets whose result is that of an earlier model run; they count for
  /// nothing.
  std::optional<std::string> findIn(std::span<const ParameterSet> sets, std::span<const EvaluationResult> results,
                                    bool isLast, const std::set<std::size_t>& repeats = {});

 private:
  bool isFixed(std::size_t measure) const { return measures_[measure].empty(); }
  std::string warning(bool hasOneChanged) const;

  SearchSpace space_;
  ParameterFields fields_;
  std::vector<std::string> measures_;
  std::vector<std::string> parameterFiles_;
  std::vector<std::string> resultFiles_;
  bool isSettled_ = true;              ///< nothing more is to be found
  int runCount_ = 0;                   ///< successful ones
  std::vector<double> written_;        ///< what the model got in the first successful run
  std::vector<double> measureValues_;  ///< of the same
  std::vector<bool> hasVaried_;        ///< by what the model got, whether another run got something else
  std::vector<bool> hasChanged_;       ///< by measure, whether another run had another value
  int otherCount_ = 0;                 ///< successful runs in which it got something else
};

}  // namespace mirevo
