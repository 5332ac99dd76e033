#pragma once

#include <limits>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "algorithms/searches/repetitions.h"
#include "report/json_writer.h"
#include "report/report_front.h"

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
  /// Of a search that judges sets by them, not by aggregates: that of the best set and the least with which it began;
  /// NaN of the others.
  double sumOfSquares = std::numeric_limits<double>::quiet_NaN();
  double startSum = std::numeric_limits<double>::quiet_NaN();
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
  NearlyEqual nearly;                      ///< which aggregates, or sums, count as equal to the least
  FrontAgreement agreement;                ///< of their fronts; compareFronts()
  double hypervolumeOfAll = std::numeric_limits<double>::quiet_NaN();  ///< of the front of all; likewise
};

/// The repetitions of a search; empty if there are none, or if they cannot be read, with the reason in `faults`, which
/// has a text on rows that are left out, too. `parameters`: those that vary, of the setup.
std::optional<ReportedRepetitions> reportedRepetitions(const std::string& filePrefix,
                                                       std::span<const std::string> parameters,
                                                       std::vector<std::string>& faults);
/// Compares the fronts of those that have ended as the log does. `front`: that of all of them, if it can be read.
void compareFronts(ReportedRepetitions& repetitions, const std::optional<ReportedFront>& front);

/// As a member of the report's data.
void writeRepetitions(JsonWriter& json, const ReportedRepetitions& repetitions);

}  // namespace mirevo
