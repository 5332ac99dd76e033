#pragma once

#include <exception>
#include <string>
#include <string_view>

namespace mirevo {

/// An unrecoverable condition. `what()` is the fixed message text that goes to the log; `detail()` holds further lines
/// (location, what was found, what to do), without a trailing newline, empty when there is nothing to add.
class FatalError final : public std::exception {
 public:
  explicit FatalError(std::string message, std::string detail = {});

  const char* what() const noexcept override { return message_.c_str(); }
  const std::string& message() const noexcept { return message_; }
  const std::string& detail() const noexcept { return detail_; }

 private:
  std::string message_;
  std::string detail_;
};

/// Thrown when a cancelled run stops; caught only by the run driver. `what()` is the message that was written.
class RunCancelled final : public std::exception {
 public:
  explicit RunCancelled(const char* message = "Simulation cancelled") : message_(message) {}
  const char* what() const noexcept override { return message_; }

 private:
  const char* message_;
};

/// Aborts the run: throws FatalError, after which the run driver ends the run in a fixed order (log, model processes,
/// MPI, progress report, exit code 1). `detail` is written to the log above the message, which is its last record.
[[noreturn]] void fatalError(std::string_view message, std::string_view detail = {});

}  // namespace mirevo
