#include "run/signal_handlers.h"

#include <algorithm>
#include <array>
#include <cstdlib>
#include <poll.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <ucontext.h>
#include <unistd.h>

#include "common/file_lock.h"
#include "common/progress_messages.h"
#include "platform/signals/signal_state.h"
#include "platform/terminal/front_end.h"
#include "run/results/run_record.h"

namespace mirevo {
namespace {

/// The stack of the handlers, so that a stack overflow can still be reported.
alignas(16) std::array<char, 65536> handlerStack;

/// "Mirevo: ", prepared for the handlers.
std::array<char, 64> boxTitle;
std::size_t boxTitleLength = 0;

/// The text before a handler's message in the record of the run, prepared for the handlers.
struct RecordedEnding {
  std::array<char, 64> text;
  std::size_t length = 0;

  void set(RunStage stage) { length = endingBeforeMessage(stage).copy(text.data(), text.size()); }
  std::string_view view() const noexcept { return {text.data(), length}; }
};
RecordedEnding endingOnRequest;
RecordedEnding endingInCrash;

/// Whether a terminal or pipe accepts anything at present (a stopped terminal does not).
bool acceptsText(int descriptor) noexcept {
  pollfd ready{descriptor, POLLOUT, 0};
  return ::poll(&ready, 1, 0) == 1 && (ready.revents & POLLOUT) != 0;
}

void showFromSignal(int descriptor, std::string_view text, std::string_view title) noexcept {
  if (acceptsText(descriptor)) writeLineFromSignal(descriptor, text, title);
}

void clearLiveLine() noexcept {
  const int terminal = signalState.liveLineDescriptor.exchange(-1);
  if (terminal < 0 || !acceptsText(terminal)) return;
  [[maybe_unused]] const ssize_t written = ::write(terminal, kClearLine.data(), kClearLine.size());
}

bool isRequest(int signalNumber) noexcept {
  return std::find(kEndingRequests.begin(), kEndingRequests.end(), signalNumber) != kEndingRequests.end();
}

/// Something has emptied the file. It stays so, as the next run would not know it for one of its own by this line.
bool isEmptied(int descriptor) noexcept {
  struct stat status {};
  return ::fstat(descriptor, &status) == 0 && S_ISREG(status.st_mode) && status.st_size == 0;
}

[[noreturn]] void endRun(int signalNumber, std::string_view message) noexcept {
  const int terminationLog = signalState.terminationLogUnit;
  if (terminationLog > 0) writeLineFromSignal(terminationLog, message);
  // The reason is in the log before the model processes are ended.
  if (const int runLog = signalState.runLogDescriptor; runLog >= 0 && !isEmptied(runLog)) {
    writeLineFromSignal(runLog, "");
    writeLineFromSignal(runLog, message);
  }
  if (void (*halt)() = signalState.haltProcesses; halt != nullptr) halt();
  if (const int results = signalState.resultFileDescriptor; results >= 0 && !isEmptied(results)) {
    writeLineFromSignal(results, message, "# ");
  }
  if (const int record = signalState.runRecordDescriptor; record >= 0 && !isEmptied(record)) {
    writeLineFromSignal(record, message, (isRequest(signalNumber) ? endingOnRequest : endingInCrash).view());
  }
  if (const int records = signalState.messageFileDescriptor; records >= 0) {
    writeLineFromSignal(records, message, progress::kEndedRecord);
    writeLineFromSignal(records, progress::kCompleteRecord);
  }
  clearLiveLine();
  if (signalState.showsMessageBox) {
    showFromSignal(STDERR_FILENO, message, {boxTitle.data(), boxTitleLength});
  } else if (signalState.writesStandardOutput) {
    showFromSignal(STDOUT_FILENO, message, {});
  }
  if (terminationLog > 0) writeLineFromSignal(terminationLog, "Abnormal completion");
  FileLock::removeFilesFromSignal();
  ::_exit(128 + signalNumber);
}

std::string_view messageOf(int signalNumber) noexcept {
  switch (signalNumber) {
    case SIGABRT:
      return "Abnormal termination";
    case SIGILL:
      return "Illegal instruction";
    case SIGINT:
      return "Control-C send";
    case SIGSEGV:
    case SIGBUS:
      return "Illegal storage access";
    default:
      return "Termination request";
  }
}

extern "C" void handleSignal(int signalNumber, siginfo_t*, void*) {
  endRun(signalNumber, messageOf(signalNumber));
}

/// The signal may be delivered to a thread of a library. If the main thread is holding signals back during a step, that
/// thread passes the signal on to the main thread.
extern "C" void handleRequest(int signalNumber, siginfo_t*, void*) {
  signalState.isEnding = true;
  const pid_t process = ::getpid();
  const bool isMainThread = static_cast<pid_t>(::syscall(SYS_gettid)) == process;
  if (isMainThread || signalState.heldSteps == 0) endRun(signalNumber, messageOf(signalNumber));
  ::syscall(SYS_tgkill, process, process, signalNumber);
}

extern "C" void handleFloatingPoint(int signalNumber, siginfo_t* information, void* context) {
  const int subCode = floatingPointSubCode(information->si_code);
  if (subCode == fpe::kUnderflow) {
#if defined(__x86_64__)
    // The instruction is repeated on return: unless the underflow trap is masked, it would raise the signal again for
    // ever.
    constexpr unsigned kUnderflowAndDenormalMask = 0x0900;
    auto* registers = static_cast<ucontext_t*>(context)->uc_mcontext.fpregs;
    if (registers != nullptr) registers->mxcsr |= kUnderflowAndDenormalMask;
#else
    static_cast<void>(context);
#endif
    return;
  }
  endRun(signalNumber, floatingPointMessage(subCode));
}

using SignalAction = void (*)(int, siginfo_t*, void*);

/// Also unblocks the signal, which the caller of the program may have blocked.
void install(int signalNumber, SignalAction handler) {
  struct sigaction action {};
  action.sa_sigaction = handler;
  action.sa_flags = SA_SIGINFO | SA_ONSTACK;
  ::sigfillset(&action.sa_mask);
  ::sigaction(signalNumber, &action, nullptr);
  sigset_t unblocked;
  ::sigemptyset(&unblocked);
  ::sigaddset(&unblocked, signalNumber);
  ::sigprocmask(SIG_UNBLOCK, &unblocked, nullptr);
}

bool isIgnored(int signalNumber) {
  struct sigaction action {};
  return ::sigaction(signalNumber, nullptr, &action) == 0 && (action.sa_flags & SA_SIGINFO) == 0 &&
         action.sa_handler == SIG_IGN;
}

}  // namespace

int floatingPointSubCode(int signalCode) noexcept {
  switch (signalCode) {
    case FPE_FLTINV:
      return fpe::kInvalid;
    case FPE_INTDIV:
    case FPE_FLTDIV:
      return fpe::kZeroDivide;
    case FPE_FLTOVF:
      return fpe::kOverflow;
    case FPE_FLTUND:
      return fpe::kUnderflow;
    case FPE_FLTRES:
      return fpe::kInexact;
    default:
      return fpe::kOther;
  }
}

std::string_view floatingPointMessage(int subCode) noexcept {
  switch (subCode) {
    case fpe::kInvalid:
      return "Floating point exception: Invalid number";
    case fpe::kDenormalized:
      return "Floating point exception: Denormalized number";
    case fpe::kZeroDivide:
      return "Floating point exception: Zero divide";
    case fpe::kOverflow:
      return "Floating point exception: Overflow";
    case fpe::kInexact:
      return "Floating point exception: Inexact precision";
    default:
      return "Floating point exception: Non-IEEE type";
  }
}

void installSignalHandlers() {
  const bool night = isUnattended();
  const char* value = std::getenv("G48");
  const std::string_view frontEnd = value == nullptr ? "" : value;
  signalState.showsMessageBox = !night;
  signalState.writesStandardOutput = night && frontEnd != "QMON" && frontEnd != "WIN";

  boxTitleLength = (programName() + ": ").copy(boxTitle.data(), boxTitle.size());

  endingOnRequest.set(RunStage::cutOff);
  endingInCrash.set(RunStage::failed);

  stack_t stack{};
  stack.ss_sp = handlerStack.data();
  stack.ss_size = handlerStack.size();
  ::sigaltstack(&stack, nullptr);

  for (const int signalNumber : {SIGABRT, SIGILL, SIGINT, SIGSEGV, SIGTERM}) {
    install(signalNumber, isRequest(signalNumber) ? handleRequest : handleSignal);
  }
  install(SIGFPE, handleFloatingPoint);
  install(SIGBUS, handleSignal);
  for (const int signalNumber : {SIGHUP, SIGQUIT, SIGXCPU}) {
    if (!isIgnored(signalNumber)) install(signalNumber, handleRequest);
  }
  // If a reader of our output goes away, or a file-size limit is reached, the write fails with an error instead.
  ::signal(SIGPIPE, SIG_IGN);
  ::signal(SIGXFSZ, SIG_IGN);
}

}  // namespace mirevo
