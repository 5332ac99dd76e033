#include "run/mirevo_main.h"

#include <cstdio>
#include <cstdlib>
#include <fcntl.h>
#include <filesystem>
#include <memory>
#include <string>
#include <unistd.h>

#include <fmt/core.h>

#include "common/version.h"
#include "platform/jobs/job_launcher.h"
#include "platform/terminal/front_end.h"
#include "run/run_driver.h"
#include "run/signal_handlers.h"
#include "run/stop_run.h"
#include "viewer/qmon_start.h"

namespace mirevo {
namespace {

constexpr std::string_view kUsage = "Usage: Mirevo kdx-file";

constexpr std::string_view kHelp = R"(
Calibrates and analyses a simulation model as the setup file (KDX format) says.

  //qmon      shows the run's progress on this terminal
  --version   prints the version
  --help      prints this text

Written beside the setup file: <setup>.log and the results of every evaluation. VOLK_PROGRESS=STDOUT prints the run's
messages here; creating the file <setup>._kill_ cancels the run.
)";

/// Whether the argument is a question about the program itself and not the name of a file.
bool isQuestion(const std::string& argument) {
  std::error_code ignored;
  return (argument == "--version" || argument == "--help") && !std::filesystem::exists(argument, ignored);
}

void answerQuestion(const std::string& argument) {
  if (argument == "--version") {
    fmt::print("Mirevo {}\n", programVersion());
  } else {
    fmt::print("{}\n{}", kUsage, kHelp);
  }
}

/// If the caller has closed standard input, output or error, opens them: otherwise the run's files would get these
/// descriptors, and messages would end up in the results.
void occupyStandardDescriptors() {
  int descriptor = 0;
  do {
    descriptor = ::open("/dev/null", O_RDWR | O_CLOEXEC);
  } while (descriptor >= 0 && descriptor <= STDERR_FILENO);
  if (descriptor > STDERR_FILENO) ::close(descriptor);
}

}  // namespace

void processStart(int argc, char** argv) {
  occupyStandardDescriptors();
  const CommandLine commandLine(argc, argv);
  if (!commandLine.wantsProgressViewer()) runWithFrontEnd("G48=WIN", commandLine);
  const auto run = [&commandLine] { runWithFrontEnd("G48=QMON", commandLine); };
  const std::string setupFileName(commandLine.setupFileName());
  // A job launcher watches the processes that it started, so the run must stay in this one.
  const bool isPartOfJob = launcherRank() >= 0;
  if (setupFileName.empty() || isQuestion(setupFileName) || isPartOfJob) run();
  const auto prepare = [] {
    ::setenv("G48", "QMON", 1);
    installSignalHandlers();
  };
  qmonExit(qmonStart(setupFileName, prepare, run));
}

void runWithFrontEnd(std::string_view environmentSetting, const CommandLine& commandLine) {
  const std::size_t equals = environmentSetting.find('=');
  const std::string name(environmentSetting.substr(0, equals));
  const std::string value(environmentSetting.substr(equals + 1));
  ::setenv(name.c_str(), value.c_str(), 1);
  mirevoMain(commandLine);
}

void mirevoMain(const CommandLine& commandLine) {
  const std::string setupFileName(commandLine.setupFileName());
  const bool answers = launcherRank() <= 0;  // only one process of a job
  if (setupFileName.empty()) {
    if (!answers) stopRun(0);  // a launcher that sees this process fail would end the one that answers
    showMessage(kUsage);
    for (const std::string& sentence : commandLine.ignored()) showMessage(sentence, {}, MessageType::warning);
    stopRun(1);
  }
  if (isQuestion(setupFileName)) {
    if (answers) answerQuestion(setupFileName);
    stopRun(0);
  }
  if (answers) {
    for (const std::string& sentence : commandLine.ignored()) showMessage(sentence, {}, MessageType::warning);
  }
  int exitCode = 1;
  std::unique_ptr<Job> job;
  {
    RunDriver driver;
    exitCode = driver.run(setupFileName);
    job = driver.takeJob();
  }
  stopRun(exitCode, job.get());
}

}  // namespace mirevo
