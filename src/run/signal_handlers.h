#pragma once

#include <csignal>
#include <string_view>

namespace mirevo {

/// Installs the handlers that turn a crash or an interrupt into a logged end without processes left behind. Reads
/// BUILDMODE and G48 at this time. SIGHUP, SIGQUIT and SIGXCPU end the run like a termination request, the first two
/// unless they are ignored already (nohup, a script's background); SIGBUS counts as an illegal storage access.
void installSignalHandlers();

/// Sub-codes of a floating-point signal.
namespace fpe {
inline constexpr int kInvalid = 129;
inline constexpr int kDenormalized = 130;
inline constexpr int kZeroDivide = 131;
inline constexpr int kOverflow = 132;
inline constexpr int kUnderflow = 133;
inline constexpr int kInexact = 134;
inline constexpr int kOther = 0;
}  // namespace fpe

/// The sub-code for the `si_code` of a SIGFPE. This platform reports denormalized operands as underflow.
int floatingPointSubCode(int signalCode) noexcept;

/// The message of a floating-point sub-code.
std::string_view floatingPointMessage(int subCode) noexcept;

}  // namespace mirevo
