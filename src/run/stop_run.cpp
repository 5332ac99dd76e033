#include "run/stop_run.h"

#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <filesystem>
#include <string>
#include <string_view>
#include <system_error>
#include <unistd.h>
#include <utility>

#include <fmt/core.h>

#include "common/files.h"
#include "common/replaceable_files.h"
#include "platform/signals/signal_state.h"
#include "platform/terminal/front_end.h"
#include "run/results/record_file.h"
#include "run/signal_handlers.h"

namespace mirevo {

void setTerminationLogUnit(int unit) {
  signalState.terminationLogUnit = unit;
}

std::string openTerminationLog(const std::string& path, std::string* kept) {
  if (signalState.terminationLogUnit > 0) return {};
  // A user's own file, or the log of a setup `basin_Termination.kdx`. What a link leads to stays as it is.
  std::string reason;
  std::error_code ignored;
  const bool isFile = std::filesystem::symlink_status(path, ignored).type() == std::filesystem::file_type::regular;
  const auto head = isFile ? readFileHead(path, reason) : std::string();
  if (!head || (!head->empty() && !isTerminationLog(*head))) {
    std::string name = keepEarlierFile(path);
    if (kept != nullptr) *kept = std::move(name);
  }
  // Removed rather than emptied: an earlier run that is just ending then writes its last line to its own file.
  ::unlink(path.c_str());
  const int unit = ::open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_APPEND | O_CLOEXEC, 0666);
  if (unit < 0) return fmt::format("Unable to open termination log: {}: {}", path, std::strerror(errno));
  setTerminationLogUnit(unit);
  return {};
}

void stopRun(int exitCode, Job* job) {
  const EndingSignalsHeld held;  // until the end of the process: nothing may be written after the completion line
  if (const int unit = signalState.terminationLogUnit; unit > 0) {
    writeLineFromSignal(unit, exitCode != 0 ? "Abnormal completion" : "Successful completion");
  }
  if (job != nullptr) job->end(exitCode);
  qmonExit(exitCode);
}

}  // namespace mirevo
