#include "run/signal_handlers.h"

#include <array>
#include <cerrno>
#include <cstdlib>
#include <poll.h>
#include <signal.h>
#include <ucontext.h>
#include <unistd.h>

#include "run/signal_state.h"

namespace mirevo {
namespace {

/// Handlers run here, so that a stack overflow can still be reported.
alignas(16) std::array<char, 65536> handlerStack;

/// Writes to a terminal or pipe, but never waits for one that takes nothing (a stopped terminal).
void showFromSignal(int descriptor, std::string_view text) noexcept {
  pollfd ready{descriptor, POLLOUT, 0};
  if (::poll(&ready, 1, 0) == 1 && (ready.revents & POLLOUT) != 0) writeLineFromSignal(descriptor, text);
}

[[noreturn]] void endRun(int signalNumber, std::string_view message) noexcept {
  const int terminationLog = signalState.terminationLogUnit;
  if (terminationLog > 0) writeLineFromSignal(terminationLog, message);
  // The log holds the reason before the model's processes are ended.
  if (const int runLog = signalState.runLogDescriptor; runLog >= 0) {
    writeLineFromSignal(runLog, "");
    writeLineFromSignal(runLog, message);
  }
  if (void (*halt)() = signalState.haltProcesses; halt != nullptr) halt();
  if (signalState.showsMessageBox) {
    showFromSignal(STDERR_FILENO, message);
  } else if (signalState.writesStandardOutput) {
    showFromSignal(STDOUT_FILENO, message);
  }
  if (terminationLog > 0) writeLineFromSignal(terminationLog, "Abnormal completion");
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
      return "Illegal storage access";
    default:
      return "Termination request";
  }
}

extern "C" void handleSignal(int signalNumber, siginfo_t*, void*) {
  endRun(signalNumber, messageOf(signalNumber));
}

extern "C" void handleFloatingPoint(int signalNumber, siginfo_t* information, void* context) {
  const int subCode = floatingPointSubCode(information->si_code);
  if (subCode == fpe::kUnderflow) {
#if defined(__x86_64__)
    // The instruction is repeated on return: without masking the underflow trap it would end here again for ever.
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

void install(int signalNumber, SignalAction handler) {
  struct sigaction action {};
  action.sa_sigaction = handler;
  action.sa_flags = SA_SIGINFO | SA_ONSTACK;
  ::sigfillset(&action.sa_mask);
  ::sigaction(signalNumber, &action, nullptr);
}

bool isIgnored(int signalNumber) {
  struct sigaction action {};
  return ::sigaction(signalNumber, nullptr, &action) == 0 && (action.sa_flags & SA_SIGINFO) == 0 &&
         action.sa_handler == SIG_IGN;
}

std::string_view environmentValue(const char* name) {
  const char* value = std::getenv(name);
  return value == nullptr ? std::string_view{} : std::string_view(value);
}

}  // namespace

void writeLineFromSignal(int descriptor, std::string_view text) noexcept {
  const int savedError = errno;
  while (!text.empty()) {
    const ssize_t written = ::write(descriptor, text.data(), text.size());
    if (written < 0 && errno != EINTR) break;
    if (written > 0) text.remove_prefix(static_cast<std::size_t>(written));
  }
  if (::write(descriptor, "\n", 1) < 0) errno = savedError;
  errno = savedError;
}

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
  const bool night = environmentValue("BUILDMODE") == "NIGHT";
  const std::string_view frontEnd = environmentValue("G48");
  signalState.showsMessageBox = !night;
  signalState.writesStandardOutput = night && frontEnd != "QMON" && frontEnd != "WIN";

  stack_t stack{};
  stack.ss_sp = handlerStack.data();
  stack.ss_size = handlerStack.size();
  ::sigaltstack(&stack, nullptr);

  sigset_t handled;
  ::sigemptyset(&handled);
  for (const int signalNumber : {SIGABRT, SIGILL, SIGINT, SIGSEGV, SIGTERM}) {
    install(signalNumber, handleSignal);
    ::sigaddset(&handled, signalNumber);
  }
  install(SIGFPE, handleFloatingPoint);
  if (!isIgnored(SIGHUP)) install(SIGHUP, handleSignal);
  // Whoever started the program may have blocked them.
  ::sigprocmask(SIG_UNBLOCK, &handled, nullptr);
  // A reader of our output that goes away, or a limit on file sizes: the write that fails says so.
  ::signal(SIGPIPE, SIG_IGN);
  ::signal(SIGXFSZ, SIG_IGN);
}

}  // namespace mirevo
