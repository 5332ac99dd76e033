#pragma once

#include <limits>
#include <optional>
#include <string>
#include <vector>

#include "algorithms/searches/repetitions.h"
#include "report/json_writer.h"

namespace mirevo {

/// A search with one of the seeds.
struct ReportedRepetition {
  int number = 0;
  int seed = 0;
  int evaluations = 0;
  int best = 0;  ///< the evaluation
  double aggregate = 0.0;
  int loops = 0;
  std::vector<double> parameters;                                 ///< those of its best set, model scale
  std::string termination;                                        ///< why it stopped
  double start = std::numeric_limits<double>::quiet_NaN();        ///< the least aggregate with which it began
  double hypervolume = std::numeric_limits<double>::quiet_NaN();  ///< of its front; NaN if it finds none
  int sameAs = 0;  ///< the number of an earlier one that is the same search
};

/// Successive evaluations that are of one repetition.
struct ReportedStretch {
  int repetition = 0;
  int first = 0;
  int last = 0;
};

struct ReportedRepetitions {
  std::vector<std::string> parameters;
  std::vector<ReportedRepetition> all;
  std::vector<ReportedStretch> stretches;  ///< none: whose evaluations are whose is not known
  NearlyEqual nearly;                      ///< which aggregates count as equal to the least
};

/// The repetitions of a search; empty if there are none, or if they cannot be read, with the reason in `faults`, which
/// has a text on rows that are left out, too. The count is that of the setup.
std::optional<ReportedRepetitions> reportedRepetitions(const std::string& filePrefix, std::size_t parameterCount,
                                                       std::vector<std::string>& faults);

/// As a member of the report's data.
void writeRepetitions(JsonWriter& json, const ReportedRepetitions& repetitions);

}  // namespace mirevo
