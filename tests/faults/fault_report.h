#pragma once

#include <map>
#include <string>
#include <vector>

#include <fmt/format.h>

namespace mirevo::testing {

/// What was tried and what of it went wrong.
class FaultReport {
 public:
  /// One fault of a kind was tried; `problems` is what was wrong with how the program took it, empty when nothing was,
  /// and `later` with what came after it.
  void tried(const std::string& kind, const std::string& fault, std::vector<std::string> problems,
             const std::vector<std::string>& later = {}) {
    problems.insert(problems.end(), later.begin(), later.end());
    ++tried_[kind];
    if (problems.empty()) return;
    ++failedCount_;
    fmt::print("FAILED {}: {}\n", kind, fault);
    for (const std::string& problem : problems) fmt::print("    {}\n", problem);
    std::fflush(stdout);
  }
  void skipped(const std::string& kind, const std::string& reason) { skipped_.push_back(kind + ": " + reason); }

  /// Prints the sums; the program's exit code.
  int finish() const {
    int sum = 0;
    for (const auto& [kind, count] : tried_) {
      fmt::print("{:5}  {}\n", count, kind);
      sum += count;
    }
    for (const std::string& text : skipped_) fmt::print("skipped: {}\n", text);
    fmt::print("{} faults tried, {} of them not taken as they should be\n", sum, failedCount_);
    return failedCount_ == 0 && sum > 0 ? 0 : 1;
  }

 private:
  std::map<std::string, int> tried_;
  std::vector<std::string> skipped_;
  int failedCount_ = 0;
};

}  // namespace mirevo::testing
