#pragma once

#include <functional>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// A question about the program, which it answers instead of running a setup.
struct ProgramQuestion {
  std::string name;                  ///< "--help", "--version" or "--keyword"
  std::string keyword;               ///< what --keyword asks for; empty: all
  std::vector<std::string> ignored;  ///< a sentence about what else is on the command line
};

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

  /// The question that is asked, the last one if there are several. None if the last ordinary argument is a file, as
  /// `isFile` says: then it is the setup file, whatever it is called.
  std::optional<ProgramQuestion> question(const std::function<bool(const std::string&)>& isFile) const;

  /// What else is on the command line and has no effect, a sentence each: other ordinary arguments, unknown switches.
  std::vector<std::string> ignored() const;

  /// Whether there is a "//qmon", in any letter case, which asks for the progress viewer.
  bool wantsProgressViewer() const;

  /// The ordinary arguments among the first hundred, as getArgument() has them.
  std::vector<std::string> ordinaryArguments() const;

 private:
  std::vector<std::string> arguments_;
};

}  // namespace mirevo
