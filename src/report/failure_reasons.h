#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// Failed evaluations of one kind.
struct FailureReason {
  std::string reason;  ///< of the first of them
  int count = 0;
  std::string example;  ///< the first of them: its number, and the last lines that its batch printed
};

/// Reads the text of `calSimErr.dat` and groups its evaluations by their reasons, the most frequent first. Reasons that
/// differ in numbers alone (a slot's folder, a value) are one. Nothing where it holds the failures of another setup.
std::vector<FailureReason> readFailureReasons(std::string_view text, std::string_view setupName);

}  // namespace mirevo
