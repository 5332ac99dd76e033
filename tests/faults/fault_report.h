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

/// Makes the program's system calls fail one after the other: in the long form all of them on files that are rarely
/// used and a spread of those on the others, each with the errors that it may meet; in the short form one call a kind
/// of file.
void tryInjectedFaults(bool isLong, FaultReport& report);

/// Runs that are stopped, killed, or see the clock move.
void tryInterruptions(bool isLong, FaultReport& report);

/// Workers of MPI jobs that are killed, stopped and starved, under a launcher that lets the job go on.
void tryLostRanks(bool isLong, FaultReport& report);

/// Faults as the system itself makes them: full disks, forbidden files, limits of a process, files removed during the
/// run. What needs rights that this process does not have is reported as skipped.
void tryRealFaults(bool isLong, FaultReport& report);

}  // namespace mirevo::testing
