#pragma once

#include <functional>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace mirevo {

/// A question about the program, which it answers instead of running a setup.
struct ProgramQuestion {
  std::string name;                  ///< "--help", "--version" or "--keyword"
  std::string keyword;               ///< what --keyword asks for; empty: all
  std::vector<std::string> ignored;  ///< a sentence about what else is on the command line
};

/// Something other than a run that the program is asked to do.
struct ProgramCommand {
  std::string name;                  ///< "--new" or "--check"
  std::string argument;              ///< the folder or the setup file; empty: none
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

  /// The command that is given, the first one if there are several. None if it is the last ordinary argument and a
  /// file, as `isFile` says.
  std::optional<ProgramCommand> command(const std::function<bool(const std::string&)>& isFile) const;

  /// An argument before the setup file that can only be a mistyped command, and the command. A run in its place would
  /// touch the results.
  std::optional<std::pair<std::string, std::string>> mistypedCommand() const;

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
