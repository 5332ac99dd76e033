#include "run/signal_handlers.h"

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fcntl.h>
#include <fenv.h>
#include <signal.h>
#include <thread>
#include <unistd.h>
#include <utility>

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "matchers.h"
#include "platform/signals/signal_state.h"
#include "run/results/run_record.h"
#include "run/stop_run.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

/// In a process of its own: logs opened and handlers installed as the run does it, then `act`.
template <typename Act>
void actWithHandlers(const TemporaryFolder& folder, Act act, const char* buildMode = "", const char* frontEnd = "WIN") {
  const auto open = [&](const char* name) {
    return ::open((folder / name).c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_APPEND, 0666);
  };
  for (const int signal : {SIGHUP, SIGQUIT}) ::signal(signal, SIG_DFL);  // where the tests run under nohup
  ::setenv("BUILDMODE", buildMode, 1);
  ::setenv("G48", frontEnd, 1);
  ::dup2(open("stdout"), STDOUT_FILENO);
  const auto openWithHead = [&](const char* name) {
    const int file = open(name);
    writeLineFromSignal(file, "#");
    return file;
  };
  signalState.runLogDescriptor = openWithHead("run.log");
  signalState.resultFileDescriptor = openWithHead("results");
  signalState.messageFileDescriptor = open("records");
  signalState.runRecordDescriptor = openWithHead("record");
  setTerminationLogUnit(open("termination.log"));
  installSignalHandlers();
  act();
  ::_exit(0);
}

const std::tuple<int, const char*, RunStage> kSignals[] = {
    {SIGABRT, "Abnormal termination", RunStage::failed},  {SIGILL, "Illegal instruction", RunStage::failed},
    {SIGINT, "Control-C send", RunStage::cutOff},         {SIGSEGV, "Illegal storage access", RunStage::failed},
    {SIGTERM, "Termination request", RunStage::cutOff},   {SIGHUP, "Termination request", RunStage::cutOff},
    {SIGBUS, "Illegal storage access", RunStage::failed}, {SIGQUIT, "Termination request", RunStage::cutOff},
    {SIGXCPU, "Termination request", RunStage::cutOff}};

TEST(SignalHandlers, EverySignalEndsTheRunWithItsMessageInEveryPlace) {
  for (const auto& [signal, message, stage] : kSignals) {
    const TemporaryFolder folder;
    EXPECT_EXIT(actWithHandlers(folder, [signal = signal] { ::raise(signal); }),
                ::testing::ExitedWithCode(128 + signal), fmt::format("^run_tests: {}\n$", message));
    EXPECT_EQ(folder.read("run.log"), fmt::format("#\n\n{}\n", message));
    EXPECT_EQ(folder.read("results"), fmt::format("#\n# {}\n", message));
    const auto record = readRunRecord(runRecordText({}, {}) + folder.read("record").substr(2));
    ASSERT_TRUE(record.has_value());
    EXPECT_EQ(record->stage, stage);
    EXPECT_EQ(record->message, message);
    EXPECT_EQ(folder.read("records"), fmt::format("STATUSEnded: {}\nPROGRE100.0\n", message));
    EXPECT_EQ(folder.read("termination.log"), std::string(message) + "\nAbnormal completion\n");
  }
}

TEST(SignalHandlers, AnUnattendedRunShowsTheMessageOnlyWithoutAFrontEnd) {
  for (const char* frontEnd : {"WIN", "QMON", ""}) {
    const TemporaryFolder folder;
    EXPECT_EXIT(actWithHandlers(
                    folder, [] { ::raise(SIGTERM); }, "NIGHT", frontEnd),
                ::testing::ExitedWithCode(143), "^$");
    EXPECT_EQ(folder.read("stdout"), *frontEnd == '\0' ? "Termination request\n" : "");
    EXPECT_EQ(folder.read("termination.log"), "Termination request\nAbnormal completion\n");
  }
}

TEST(SignalHandlers, TheReasonIsLoggedBeforeTheModelIsHalted) {
  const TemporaryFolder folder;
  const auto haltWhileSayingSo = [] {
    signalState.haltProcesses = [] { writeLineFromSignal(signalState.runLogDescriptor, "halted"); };
    ::raise(SIGINT);
  };
  EXPECT_EXIT(actWithHandlers(folder, haltWhileSayingSo), ::testing::ExitedWithCode(130), "");
  EXPECT_EQ(folder.read("run.log"), "#\n\nControl-C send\nhalted\n");
}

TEST(SignalHandlers, FilesThatSomethingHasEmptiedStayEmpty) {
  const TemporaryFolder folder;
  const auto emptyAndEnd = [&] {
    for (const char* name : {"run.log", "results", "record"}) ::truncate((folder / name).c_str(), 0);
    ::raise(SIGTERM);
  };
  EXPECT_EXIT(actWithHandlers(folder, emptyAndEnd), ::testing::ExitedWithCode(143), "");
  for (const char* name : {"run.log", "results", "record"}) EXPECT_EQ(folder.read(name), "") << name;
}

TEST(SignalHandlers, ARunUnderNohupOutlivesItsTerminal) {
  const TemporaryFolder folder;
  const auto hangUp = [] {
    for (const int signal : {SIGHUP, SIGQUIT}) {
      ::signal(signal, SIG_IGN);
      installSignalHandlers();
      ::raise(signal);
    }
  };
  EXPECT_EXIT(actWithHandlers(folder, hangUp), ::testing::ExitedWithCode(0), "^$");
}

/// A library's thread must not take it either, as the kernel lets one do where the main thread does not.
TEST(SignalHandlers, ARequestWaitsForTheEndOfAStepOfTheMainThread) {
  const TemporaryFolder folder;
  const auto askInTheMiddle = [] {
    std::thread other([] { ::pause(); });
    {
      const EndingSignalsHeld held;
      ::kill(::getpid(), SIGTERM);
      writeLineFromSignal(signalState.resultFileDescriptor, "whole record");
    }
    other.join();
  };
  EXPECT_EXIT(actWithHandlers(folder, askInTheMiddle), ::testing::ExitedWithCode(143), "");
  EXPECT_EQ(folder.read("results"), "#\nwhole record\n# Termination request\n");
}

TEST(SignalHandlers, FloatingPointSubCodesHaveTheirOwnMessages) {
  const std::string start = "Floating point exception: ";
  const std::pair<int, const char*> cases[] = {{FPE_FLTINV, "Invalid number"},    {FPE_FLTDIV, "Zero divide"},
                                               {FPE_INTDIV, "Zero divide"},       {FPE_FLTOVF, "Overflow"},
                                               {FPE_FLTRES, "Inexact precision"}, {FPE_FLTSUB, "Non-IEEE type"},
                                               {SI_USER, "Non-IEEE type"}};
  for (const auto& [signalCode, message] : cases) {
    EXPECT_EQ(floatingPointMessage(floatingPointSubCode(signalCode)), start + message) << signalCode;
  }
  EXPECT_EQ(floatingPointMessage(fpe::kDenormalized), start + "Denormalized number");
}

#if defined(__x86_64__) && defined(__GLIBC__)
TEST(SignalHandlers, TrappedZeroDivideEndsTheRunAndUnderflowDoesNot) {
  const TemporaryFolder folder;
  const auto divide = [] {
    ::feenableexcept(FE_DIVBYZERO);
    volatile double zero = 0.0;
    volatile double result = 1.0 / zero;
    static_cast<void>(result);
  };
  EXPECT_EXIT(actWithHandlers(folder, divide), ::testing::ExitedWithCode(136), "Zero divide");

  const auto underflow = [] {
    ::feenableexcept(FE_UNDERFLOW);
    volatile double tiny = 1e-300;
    volatile double result = tiny * tiny;
    std::fprintf(stderr, "went on with %g\n", result);
  };
  EXPECT_EXIT(actWithHandlers(folder, underflow), ::testing::ExitedWithCode(0), "went on with 0");
}
#endif

TEST(StopRun, TheCompletionLineGoesToATerminationLogThatIsSet) {
  const TemporaryFolder folder;
  for (const int exitCode : {0, 1}) {
    EXPECT_EXIT(actWithHandlers(folder, [&] { stopRun(exitCode); }), ::testing::ExitedWithCode(exitCode), "");
    EXPECT_EQ(folder.read("termination.log"), exitCode == 0 ? "Successful completion\n" : "Abnormal completion\n");
  }
  const auto without = [] {
    setTerminationLogUnit(0);
    stopRun(0);
  };
  EXPECT_EXIT(actWithHandlers(folder, without), ::testing::ExitedWithCode(0), "");
  EXPECT_EQ(folder.read("termination.log"), "");
}

TEST(StopRun, ATerminationLogIsThatOfTheLatestRunAndAnEarlierOneStillWritesItsOwn) {
  const TemporaryFolder folder;
  const auto runTwice = [&] {
    setTerminationLogUnit(0);
    std::string kept;
    EXPECT_EQ(openTerminationLog(folder / "a.log", &kept), "");
    EXPECT_EQ(kept, folder / "a.1.log");
    const int earlier = signalState.terminationLogUnit;
    setTerminationLogUnit(0);
    EXPECT_EQ(openTerminationLog(folder / "a.log"), "");
    EXPECT_EQ(openTerminationLog(folder / "b.log"), "");  // one is set already
    writeLineFromSignal(earlier, "of the earlier run");
    stopRun(0);
  };
  folder.write("a.log", "of another origin\n");
  EXPECT_EXIT(actWithHandlers(folder, runTwice), ::testing::ExitedWithCode(0), "");
  EXPECT_EQ(folder.read("a.log"), "Successful completion\n");
  EXPECT_EQ(folder.read("a.1.log"), "of another origin\n");
  EXPECT_FALSE(folder.exists("b.log"));
  EXPECT_THAT(openTerminationLog(folder / "no/such/folder/a.log"), StartsWith("Unable to open"));
}

}  // namespace
}  // namespace mirevo
