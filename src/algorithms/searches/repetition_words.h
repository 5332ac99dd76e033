#pragma once

// What the logs of repetitions of any search have in common.
#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <vector>

#include "algorithms/searches/repetitions.h"

namespace mirevo {

/// Of values in any order, at least one.
struct Spread {
  double least = 0.0;
  double median = 0.0;
  double greatest = 0.0;
};
Spread spreadOf(std::vector<double> values);

/// "The 5 repetitions of the search:"; of fewer than planned, those that had begun.
std::string repetitionHeading(std::size_t count, std::int32_t planned);
/// Why it stopped, or that it has not ended.
std::string whyItStopped(const Repetition& repetition);
/// The share of its range that parameter k takes up in these best sets, on the search scale, but an integer one with
/// the values that runs had.
double rangeShare(const std::vector<const Repetition*>& repetitions, const SearchSpace& space, std::size_t k);
/// The parameters of these best sets on the model scale, each with its spread and share of its range, in percent.
std::vector<std::vector<double>> parameterSpreads(const std::vector<const Repetition*>& repetitions,
                                                  const SearchSpace& space);

/// Which of them ended without a successful run and count for nothing in what is said of all; empty if none did.
std::string withoutBestText(std::span<const Repetition> repetitions);

/// repetitionLines() of repetitions that have fronts.
std::vector<std::string> repeatedFrontLines(std::span<const Repetition> repetitions, const SearchSpace& space,
                                            std::span<const std::string> objectives, std::int32_t planned);

}  // namespace mirevo
