#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "algorithms/analyses/effect_statistics.h"
#include "report/json_writer.h"

namespace mirevo {

/// The elementary effects of a parameter, as the table of a screening has them.
struct ReportedEffects {
  std::string parameter;
  LimitedValue mu;
  LimitedValue muStar;
  LimitedValue sigma;
  LimitedValue share;
  int count = 0;
  int rank = 0;  ///< 0: none
  int rankLower = 0;
  int rankUpper = 0;
  double rankStability = 0.0;
  double certainty = 0.0;
  std::string verdict;  ///< "fix", "keep", "undecided" or empty
};

/// Those of all parameters on one output.
struct ReportedScreening {
  std::string kind;  ///< "measure", "objective" or "validation"
  std::string name;
  double negligible = 0.0;  ///< the share of the largest mu* below which a parameter is negligible
  int topCount = 0;
  double topStability = 0.0;
  double fixedTogether = 0.0;
  std::vector<ReportedEffects> parameters;
};

/// A Morris screening from the table that it has written; empty, with the fault, if that is not there or damaged.
std::vector<ReportedScreening> reportedMorris(const std::string& filePrefix, std::string& fault);

/// As member `morris` of the open object.
void writeMorris(JsonWriter& json, const std::vector<ReportedScreening>& screenings);

}  // namespace mirevo
