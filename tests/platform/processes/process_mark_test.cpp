#include "platform/processes/process_mark.h"

#include <csignal>
#include <spawn.h>
#include <string>
#include <sys/wait.h>
#include <vector>

#include <gtest/gtest.h>

namespace mirevo {
namespace {

/// A process that sleeps, with `variable` in its environment behind `before` bytes of another one.
pid_t sleeperWith(std::size_t before, const char* variable) {
  std::string padding = "A=" + std::string(before - 3, 'x');  // and a zero behind it
  std::string mark = variable;
  char* environment[] = {padding.data(), mark.data(), nullptr};
  char* arguments[] = {const_cast<char*>("sleep"), const_cast<char*>("600"), nullptr};
  pid_t process = 0;
  EXPECT_EQ(::posix_spawn(&process, "/bin/sleep", nullptr, nullptr, arguments, environment), 0);
  return process;
}

/// The signal that has ended the process, or ends it now.
int signalThatEnded(pid_t process) {
  ::kill(process, SIGTERM);
  int status = 0;
  ::waitpid(process, &status, 0);
  return WTERMSIG(status);
}

TEST(ProcessMark, EndsItsBearersWhereverItStandsInALongEnvironmentAndNobodyElse) {
  const ProcessMark mark;
  const pid_t stranger = sleeperWith(100, ProcessMark().variable());
  std::vector<pid_t> bearers;
  for (const std::size_t endOfRead : {4096U, 8192U}) {
    for (std::size_t before = endOfRead - 28; before <= endOfRead; ++before)
      bearers.push_back(sleeperWith(before, mark.variable()));
  }
  mark.endBearers();
  for (const pid_t bearer : bearers) EXPECT_EQ(signalThatEnded(bearer), SIGKILL);
  EXPECT_EQ(signalThatEnded(stranger), SIGTERM);
}

}  // namespace
}  // namespace mirevo
