#pragma once

#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// The arguments after the program's name. Those that begin with "//" are switches of the front end, the others are
/// ordinary arguments.
class CommandLine final {
 public:
  explicit CommandLine(std::vector<std::string> arguments) : arguments_(std::move(arguments)) {}
  CommandLine(int argc, char** argv) : arguments_(argv + (argc > 0 ? 1 : 0), argv + argc) {}

  /// One more than the number of ordinary arguments among the first hundred.
  int countArguments() const;

  /// The `index`-th ordinary argument, from 1; empty when there is none.
  std::string_view getArgument(int index) const;

  /// The last ordinary argument: the setup file; empty when there is none or it is blank.
  std::string_view setupFileName() const;

  /// What else is on the command line and has no effect, a sentence each: other ordinary arguments, unknown switches.
  std::vector<std::string> ignored() const;

  /// Whether there is a "//qmon", in any letter case, which asks for the progress viewer.
  bool wantsProgressViewer() const;

 private:
  std::vector<std::string> arguments_;
};

}  // namespace mirevo
