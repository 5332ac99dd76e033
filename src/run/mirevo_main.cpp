#include "run/mirevo_main.h"

#include <cstdlib>
#include <fcntl.h>
#include <filesystem>
#include <memory>
#include <string>
#include <unistd.h>
#include <vector>

#include <fmt/core.h>
#include <fmt/ranges.h>

#include "common/text.h"
#include "common/version.h"
#include "platform/jobs/job_launcher.h"
#include "platform/jobs/mpi_module.h"
#include "platform/terminal/front_end.h"
#include "report/library_versions.h"
#include "run/new_setup.h"
#include "run/run_driver.h"
#include "run/setup/keyword_help.h"
#include "run/setup_check.h"
#include "run/signal_handlers.h"
#include "run/stop_run.h"
#include "viewer/qmon_start.h"

namespace mirevo {
namespace {

constexpr std::string_view kUsage = "Usage: Mirevo kdx-file";

constexpr std::string_view kHelp = R"(
Calibrates and analyses a simulation model as the setup file (KDX format) says.

  //qmon           shows the run's progress on this terminal
  --check SETUP    reads and checks the setup, runs the model once (with the
                   initial values, if the task can), shows what was read and
                   computed, and stops
  --new [FOLDER]   writes a small setup that runs, with its model and data
  --keyword        names every keyword of a setup, as SECTION/Keyword
  --keyword NAME   explains a keyword or a section
  --version        prints the version, and what the program was built with
  --help, -h       prints how it is called, and what its exit codes mean

Of several setup files the last one counts. Written beside it: <setup>.log and
the results of every evaluation. VOLK_PROGRESS=STDOUT prints the run's messages
here; creating the file <setup>._kill_ cancels the run. On a terminal the run
shows a line about itself, unless VOLK_PROGRESS=NONE.

Exit codes: 0 after a normal termination, an answer or a check that found
nothing wrong; 1 after an error, a cancelled run or a command line that is
refused; 128 + the signal's number after a signal.
)";

/// Whether an argument is the setup file and no question. A keyword's name is not, where it follows --keyword.
bool isSetup(const std::string& argument) {
  std::error_code ignored;
  return std::filesystem::exists(argument, ignored) && keywordHelp(argument).empty();
}

/// Returns the exit code.
int answerKeyword(const std::string& name) {
  if (name.empty()) return writeAnswer(fmt::format("{}\n", fmt::join(keywordNames(), "\n")));
  if (const std::string help = keywordHelp(name); !help.empty()) return writeAnswer(help);
  const std::vector<std::string> like = namesLike(name);
  showMessage(fmt::format(
      "No section has the keyword {}{}", quotedForMessage(name),
      like.empty() ? "; Mirevo --keyword names them all" : fmt::format("; did you mean {}?", fmt::join(like, ", "))));
  return 1;
}

/// Returns the exit code.
int answer(const ProgramQuestion& question) {
  if (question.name == "--keyword") return answerKeyword(question.keyword);
  std::string text = fmt::format("{}\n{}", kUsage, kHelp);
  if (question.name == "--version") {
    text = fmt::format("{}MPI: {}\n", versionText("Mirevo", libraryVersions()), mpiSupport());
  }
  return writeAnswer(text);
}

/// Does what is asked instead of a run; returns the exit code.
int obey(const ProgramCommand& command) {
  if (command.name == "--new") return writeNewSetup(command.argument);
  if (!command.argument.empty()) return checkSetup(command.argument);
  showMessage("Usage: Mirevo --check kdx-file");
  return 1;
}

/// Whether it can only be meant as an option, which would otherwise be taken for the name of a setup.
bool isUnknownOption(const std::string& argument) {
  std::error_code ignored;
  return argument.starts_with("-") && !toLowerAscii(argument).ends_with(".kdx") &&
         !std::filesystem::exists(argument, ignored) && !std::filesystem::exists(argument + ".kdx", ignored);
}

void showIgnored(const std::vector<std::string>& sentences) {
  for (const std::string& sentence : sentences) showMessage(sentence, {}, MessageType::warning);
}

/// If the caller has closed standard input, output or error, opens them: otherwise the run's files would get these
/// descriptors, and messages would end up in the results. `access` is how: an answer must not seem to be written.
void occupyStandardDescriptors(int access) {
  int descriptor = 0;
  do {
    descriptor = ::open("/dev/null", access | O_CLOEXEC);
  } while (descriptor >= 0 && descriptor <= STDERR_FILENO);
  if (descriptor > STDERR_FILENO) ::close(descriptor);
}

}  // namespace

void processStart(int argc, char** argv) {
  const CommandLine commandLine(argc, argv);
  const bool isRun = !commandLine.question(isSetup) && !commandLine.command(isSetup);
  occupyStandardDescriptors(isRun ? O_RDWR : O_RDONLY);
  if (!commandLine.wantsProgressViewer()) runWithFrontEnd("G48=WIN", commandLine);
  const auto run = [&commandLine] { runWithFrontEnd("G48=QMON", commandLine); };
  const std::string setupFileName(commandLine.setupFileName());
  // A job launcher watches the processes that it started, so the run must stay in this one.
  const bool isPartOfJob = launcherRank() >= 0;
  if (!isRun || setupFileName.empty() || isUnknownOption(setupFileName) || isPartOfJob) run();
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
  if (const auto question = commandLine.question(isSetup)) {
    if (answers) showIgnored(question->ignored);
    stopRun(answers ? answer(*question) : 0);  // a launcher that sees this process fail would end the one that answers
  }
  if (const auto command = commandLine.command(isSetup)) {
    if (!answers) stopRun(0);
    showIgnored(command->ignored);
    stopRun(obey(*command));
  }
  if (const auto mistyped = commandLine.mistypedCommand()) {
    if (!answers) stopRun(0);
    showMessage(
        fmt::format("Unknown option {}; did you mean {}?", quotedForMessage(mistyped->first), mistyped->second));
    stopRun(1);
  }
  if (setupFileName.empty() || isUnknownOption(setupFileName)) {
    if (!answers) stopRun(0);
    if (!setupFileName.empty()) showMessage("Unknown option " + quotedForMessage(setupFileName));
    showMessage(kUsage);
    showIgnored(commandLine.ignored());
    stopRun(1);
  }
  if (answers) showIgnored(commandLine.ignored());
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
