#pragma once

#include "algorithms/search_algorithm.h"
#include "algorithms/search_settings.h"
#include "algorithms/uniform_generator.h"
#include "evaluation/evaluator.h"

namespace mirevo {

/// Dynamically Dimensioned Search after Tolson and Shoemaker (2007), doi:10.1029/2005WR004723.
class Dds final : public SearchAlgorithm {
 public:
  Dds(DdsSettings settings, int maxEvaluations, bool startFromInitial, SearchBounds bounds, Evaluator& evaluator,
      UniformGenerator& random);

  SearchStatus initialise() override;
  SearchStatus advance() override;
  bool isTerminated() const override;
  const SearchSummary& summary() const override { return summary_; }

 private:
  DdsSettings settings_;
  int maxEvaluations_;
  bool startFromInitial_;
  SearchBounds bounds_;
  Evaluator& evaluator_;
  UniformGenerator& random_;
  SearchSummary summary_;
};

}  // namespace mirevo
