#pragma once

#include <cstddef>
#include <map>
#include <set>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "evaluation/evaluation_result.h"
#include "run/results/record_file.h"

namespace mirevo {

/// Pairs by the number of their evaluation.
using PairsByNumber = std::map<int, std::vector<MeasurePairs>>;

/// The pairs that an earlier run has left.
struct EarlierPairs {
  PairsByNumber pairs;
  std::size_t lostRows = 0;  ///< cut off or damaged
};

/// The pairs and files of the first successful run and of the runs that differ, `<setup>_Pairs.dat` and its like: for
/// programs, and for a restart, which compares further runs with the first successful one. The file appears with the
/// first pairs.
class PairsFile final {
 public:
  /// `tableHead` is over the table, for people.
  PairsFile(std::string path, std::vector<std::string> tableHead);

  /// What an interrupted run has left. Throws FatalError if the file cannot be read.
  EarlierPairs readEarlier() const;
  /// Continues the file behind those pairs. Throws FatalError.
  void continueBehind(PairsByNumber earlier);
  /// Throws FatalError when they cannot be written.
  void add(int number, std::span<const MeasurePairs> pairs);
  /// At the end of a run: leaves the evaluations with those numbers, in their order, or all if no number is given.
  /// False, with the system's reason, when that fails.
  bool finish(const std::set<int>& numbers, std::string& reason);

  bool has(int number) const { return pairs_.count(number) > 0; }
  /// All that it holds.
  const PairsByNumber& pairs() const { return pairs_; }
  const std::string& path() const { return path_; }

 private:
  std::string path_;
  std::vector<std::string> tableHead_;
  PairsByNumber pairs_;
  RecordFile file_;
};

/// The rows of the table's text. Any text is taken; what is no row is left out.
PairsByNumber readPairsTable(std::string_view text);
/// The whole table, below `head` for people.
std::string pairsTableText(std::span<const std::string> head, const PairsByNumber& pairs);

}  // namespace mirevo
