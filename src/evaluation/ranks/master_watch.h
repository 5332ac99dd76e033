#pragma once

#include <functional>
#include <optional>
#include <string>
#include <sys/stat.h>

namespace mirevo {

/// A worker's look at the run's kill file. The master looks at it more often and stops its workers as soon as it sees
/// it; one that does not is itself stopped or stuck, and a worker has to end the job.
class MasterWatch {
 public:
  static constexpr double kLookSeconds = 0.5;      ///< between two looks at the file
  static constexpr double kAnswerSeconds = 2.25;   ///< for a master that can answer
  static constexpr double kClosingSeconds = 60.0;  ///< for one that has stopped its workers, and closes its files

  using Clock = std::function<double()>;

  /// `endJob` is called when the master is silent. A file that is there now is left over from an earlier run: the
  /// master has removed it, but another machine may show it for some time yet.
  MasterWatch(std::string killFile, Clock clock, std::function<void()> endJob);

  /// Ends the job if the kill file has been there for that time. To be called often.
  void requireAnswerWithin(double seconds);

 private:
  std::optional<struct stat> look() const;

  std::string killFile_;
  Clock clock_;
  std::function<void()> endJob_;
  std::optional<struct stat> leftOver_;
  double nextLook_;
  std::optional<double> firstSeen_;
};

}  // namespace mirevo
