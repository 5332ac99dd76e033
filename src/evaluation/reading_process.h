#pragma once

#include <functional>
#include <optional>
#include <string>

#include "evaluation/evaluation_result.h"
#include "platform/processes/helper_process.h"

namespace mirevo {

/// What the files of a model run tell. All else of its result is known to the program alone, and added by it.
struct RunReading {
  EvaluationResult result;   ///< its series to be shown may turn out not to be wanted
  bool mayBeCutOff = false;  ///< see OutputReader::mayBeCutOff()
  double seconds = 0.0;      ///< that reading took
};

/// Reads the files of one model run in a child process, a copy of the program at that moment, so that the program can
/// go on. Nothing that is read there changes the program but what take() returns. Ended with the object.
class ReadingProcess final {
 public:
  enum class State {
    reading,
    done,
    lost,  ///< it has ended, or had to be, without an answer: the files can be read again
  };

  /// Starts it: it calls `read` and passes on what that returns, or the FatalError that it throws. After
  /// `seconds` it is lost. False when no process can be started.
  bool start(const std::function<RunReading()>& read, double seconds);
  /// To be called when socket() has become readable, and now and then.
  State look();
  /// After State::done. Throws the FatalError of the process.
  RunReading take();
  int socket() const { return helper_.socket(); }

 private:
  HelperProcess helper_;
  std::string arrived_;
  double deadline_ = 0.0;  ///< by runTimeClock()
};

}  // namespace mirevo
