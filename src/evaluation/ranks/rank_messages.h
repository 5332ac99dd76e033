#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "common/parameter_set.h"
#include "evaluation/evaluation_result.h"
#include "evaluation/run_comparison.h"

namespace mirevo {

/// What the master (rank 0) and its workers tell each other.
///
///   master                          worker
///     | begin (setup) ---------------> |  reads the setup, makes its process folder
///     | <-------------- ready (place)  |
///     | set -------------------------> |  runs the model                            as often as there are sets
///     | <-------------------- result   |
///     | keep folder ----------------> |  after a failed run, where its folder is evidence to keep
///     | <------------------- given up  |  in place of a result: the set is another worker's, as the model has damaged
///     |                                |  this one's folder once too often; from now on it only waits for stop
///     | <--------------------- alive   |  several times within the time after which a silent worker is lost, while
///     |                                |  the model runs and its results are read
///     | stop ------------------------> |  at any time; ends its model's processes
///     | <------------------ farewell   |  then both leave the job
///     | leave -----------------------> |  before that in a job that outlives losses, in which they do not meet
///
/// A worker that meets a fatal error sends `failure` at any time and waits for `stop`. The set of a worker that is lost
/// goes to another one (WorkerWatch); the first result counts, and later ones are dropped.
enum class RankMessage : int {
  begin = 1,
  set,
  stop,
  ready,
  result,
  failure,
  farewell,
  keepFolder,
  givenUp,
  alive,
  leave
};

/// The setup file as the master read it, so that all ranks use the same text.
struct BeginMessage {
  std::string setupFile;  ///< absolute path
  std::string text;
};

/// Where a worker runs.
struct ReadyMessage {
  std::string host;
  std::string processFolder;
  std::vector<std::string> warnings = {};  ///< on the making of the folder
};

/// A set to be run.
struct SetMessage {
  int number = 0;  ///< number of the evaluation in the run, from 1
  ParameterSet set;
  RunStandard standard;
  std::vector<double> repeatedMeasures;  ///< of the row that the evaluation has, if its model is run again beside it
  bool isFinal = false;                  ///< the best set of a search, run once more
};

struct ResultMessage {
  EvaluationResult result;
  std::string leftBehind;             ///< what the launcher says of processes that had to be ended, or empty
  std::vector<std::string> warnings;  ///< of the worker, since its last message; those of this run are in `result`
};

/// Tells a worker to keep the folder of its last run.
struct KeepFolderMessage {
  int number = 0;  ///< of the evaluation
};

/// Why the model cannot be run by a worker any more (FolderDamage), and what the user should know besides.
struct GivenUpMessage {
  std::string what;
  std::string why;
  std::vector<std::string> warnings;
  bool isFinal = false;
};

struct FailureMessage {
  std::string message;
  std::string detail;
};

// Numbers are sent as their bytes, so that a result has the same bits as a local one. Each decode function throws
// FatalError for content that its encode function cannot have made.

std::string encode(const BeginMessage& message);
BeginMessage decodeBegin(std::string_view content);
std::string encode(const SetMessage& message);
SetMessage decodeSet(std::string_view content);
std::string encode(const ReadyMessage& message);
ReadyMessage decodeReady(std::string_view content);
std::string encode(const ResultMessage& message);
ResultMessage decodeResult(std::string_view content);
std::string encode(const KeepFolderMessage& message);
KeepFolderMessage decodeKeepFolder(std::string_view content);
std::string encode(const GivenUpMessage& message);
GivenUpMessage decodeGivenUp(std::string_view content);
std::string encode(const FailureMessage& message);
FailureMessage decodeFailure(std::string_view content);

}  // namespace mirevo
