#include "run/stop_run.h"

#include "platform/front_end.h"
#include "run/signal_state.h"

namespace mirevo {

void setTerminationLogUnit(int unit) {
  signalState.terminationLogUnit = unit;
}

void stopRun(int exitCode) {
  if (const int unit = signalState.terminationLogUnit; unit > 0) {
    writeLineFromSignal(unit, exitCode != 0 ? "Abnormal completion" : "Successful completion");
  }
  qmonExit(exitCode);
}

}  // namespace mirevo
