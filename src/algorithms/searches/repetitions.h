#pragma once

#include <cmath>
#include <cstddef>
#include <cstdint>
#include <limits>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "common/data_table.h"
#include "common/parameter_set.h"
#include "parameters/search_space.h"

namespace mirevo {

/// How the repetitions of a search follow one another.
enum class RepetitionOrder : std::int32_t {
  consecutive,  ///< each begins when the one before it has ended
  sideBySide    ///< all go on at the same time
};

/// A search that is made several times, with one seed after the other.
struct RepetitionSettings {
  std::int32_t count = 1;
  RepetitionOrder order = RepetitionOrder::consecutive;

  bool areSideBySide() const { return count > 1 && order == RepetitionOrder::sideBySide; }
};

/// More than any spread needs; each has a thread when they go on side by side.
inline constexpr std::int32_t kMostRepetitions = 1000;

/// The seed of the repetition with this 0-based index: that of the run, and then one more each time; one less for a
/// negative seed, of which the sign does not matter. Behind the largest number follow seeds whose streams are those
/// that larger ones would have, so that no two repetitions have the same.
std::int32_t repetitionSeed(std::int32_t seed, std::int32_t index);
/// "seeds 3 to 7", "seed 3"
std::string seedsText(std::int32_t seed, std::int32_t count);

/// The front of a repetition, beside that of all of them together.
struct RepetitionFront {
  double hypervolume = 0.0;             ///< on the scale of the front of all
  std::size_t size = 0;                 ///< sets
  std::size_t sharedSize = 0;           ///< of them with values that are on the front of all
  std::vector<double> least = {};       ///< of each objective; empty without a front
  std::vector<double> compromise = {};  ///< the objectives of its best set; likewise
  double hypervolumeOfAll = 0.0;        ///< of the front of all
  std::size_t sizeOfAll = 0;            ///< sets on the front of all
};

/// What follows from the fronts of the repetitions that have ended with one.
struct FrontAgreement {
  enum class Verdict : std::uint8_t {
    none,     ///< nothing to compare: fewer than two fronts, or no hypervolume of all
    differ,   ///< not all come near the front of all
    agree,    ///< all do
    oneSet,   ///< all do, and the front of all is a single set, without a trade-off
    noSearch  ///< none went on beyond the sets that it began with
  };
  Verdict verdict = Verdict::none;
  std::size_t near = 0;  ///< fronts within kNearlyEqualShare of the hypervolume of all
};
/// `hypervolumes`: of their fronts, on the scale of the front of all; `ofAll` and `sizeOfAll` of that, which may have
/// sets that none of theirs has; 0 sets: not known. `loops`: that they made in all.
FrontAgreement frontAgreement(std::span<const double> hypervolumes, double ofAll, std::size_t sizeOfAll,
                              std::int64_t loops);

/// A repetition as far as it has come. The best set of a search for a front is the set of its front that is nearest to
/// the ideal point of the front of all repetitions, on the scale of that.
struct Repetition {
  std::int32_t seed = 0;
  int evaluations = 0;                                          ///< whose results it has
  int bestEvaluation = 0;                                       ///< the number in the run; 0: none has succeeded
  double aggregate = std::numeric_limits<double>::quiet_NaN();  ///< of the best
  ParameterSet best = {};                                       ///< search scale; empty without a best one
  int loops = 0;                                                ///< 0 until it has ended
  std::string termination = {};                                 ///< empty until it has ended
  /// The least of the sets that it evaluated before it proposed any; NaN if none of them has succeeded.
  double startAggregate = std::numeric_limits<double>::quiet_NaN();
  ParameterSet start = {};  ///< with it; search scale
  /// Of one that has ended and judges sets by them, not by aggregates: that of the best set, and the least of its
  /// sample; else NaN.
  double sumOfSquares = std::numeric_limits<double>::quiet_NaN();
  double startSum = std::numeric_limits<double>::quiet_NaN();
  std::optional<RepetitionFront> front = {};  ///< of a search that finds one
  /// Of one that has ended and drew no random numbers behind its sample: SearchSummary::starts.
  std::vector<ParameterSet> starts = {};

  bool isJudgedBySums() const { return !std::isnan(sumOfSquares); }
  /// What it has come to, by which it is compared with others, and where it began.
  double value() const { return isJudgedBySums() ? sumOfSquares : aggregate; }
  double startValue() const { return isJudgedBySums() ? startSum : startAggregate; }
};

/// For each the number of the earlier repetition that started from the same sets and that was the same search from
/// there on; 0 if there is none.
std::vector<int> sameSearches(std::span<const Repetition> repetitions);
/// "Repetitions 1, 3 and 4 started from the same sets ...", of all groups; empty if there are none.
std::string sameSearchesText(std::span<const Repetition> repetitions);

/// Successive evaluations of one repetition, all of these numbers.
struct RepetitionStretch {
  int repetition = 0;  ///< from 1
  int first = 0;
  int last = 0;
};

/// The repetitions that have begun, for programs; all of them, or none, have a front.
DataTable repetitionTable(std::span<const Repetition> repetitions, const SearchSpace& space);
/// Which evaluations are whose, for programs.
DataTable repetitionRowTable(std::span<const RepetitionStretch> stretches);

/// Best values that differ from a least one above 0 by no more than this share of it count as equal to it; from one
/// below 0, by no more than this share of its size and of the way to it from where the repetitions began, as 0 may lie
/// anywhere then,
inline constexpr double kNearlyEqualShare = 0.01;
/// or than this share of that way, where that is more: a share of a least value at 0 is nothing. So much numbers of 32
/// bits resolve where the repetitions began.
inline constexpr double kNearlyEqualFall = 1.0e-7;

/// Which best values count as equal to the least.
struct NearlyEqual {
  double tolerance = 0.0;  ///< above the least
  bool isOfLeast = false;  ///< it is kNearlyEqualShare of the least value, which is above 0
  /// Repetitions that began with such a value, if these are half of them or more, so that their best values lie near
  /// each other though they have found next to nothing; else 0.
  std::size_t atStart = 0;

  /// "1 % of the least", "0.0012 of the least"
  std::string text() const;
};
/// `starts`: the values with which repetitions began, NaN where there is none; the way is from their median.
NearlyEqual nearlyEqual(double least, std::span<const double> starts);

/// A parameter is poorly identified if at nearly equal values it takes up more than this share of its range.
inline constexpr double kWideShare = 0.1;

/// The repetitions and their spread for people: a table, the spread of the best values and of each parameter of the
/// best sets, and what follows from them; of fronts that of their hypervolumes and compromises. `objectives`: the names
/// of the objective functions. `planned`: how many repetitions there are to be.
std::vector<std::string> repetitionLines(std::span<const Repetition> repetitions, const SearchSpace& space,
                                         std::span<const std::string> objectives, std::int32_t planned);

}  // namespace mirevo
