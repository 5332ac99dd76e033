#pragma once

#include <cstddef>
#include <cstdint>
#include <deque>
#include <map>
#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// What the records of a run so far tell a viewer, in so few records that a message file can begin with them.
class RecordSummary final {
 public:
  /// Takes a record that was written.
  void take(std::string_view kind, std::string_view text);
  /// The records that stand for all taken so far.
  std::string records() const;

 private:
  /// An improvement, after so many evaluations.
  struct Best {
    std::int64_t done;
    std::int64_t failed;
    std::string text;
  };
  void takeMessage(std::string_view text);
  void addBest(std::string_view text);

  std::string started_;
  std::string title_;
  std::string status_;
  std::map<std::string, std::string, std::less<>> latest_;  ///< of other kinds
  std::int64_t done_ = 0;                                   ///< evaluations, including failed ones
  std::int64_t failed_ = 0;
  std::vector<Best> bests_;  ///< thinned when there are many; the last one is the best
  std::size_t bestsToSkip_ = 0;
  std::size_t skippedBests_ = 0;
  std::deque<std::string> notices_;  ///< the latest messages that are not routine
};

}  // namespace mirevo
