#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "platform/kdx/kdx.h"
#include "run/progress/run_log.h"
#include "run/setup/keyword_table.h"
#include "run/setup/run_config.h"

namespace mirevo {

class SetupSection;

/// A parsed setup file and the log that everything read from it is echoed to.
class SetupFile final {
 public:
  /// `fileName` is the name that messages show, `folder` the absolute folder against which file names are resolved.
  /// Throws FatalError with "Error: Unable to open " and the name for a text that is no KDX.
  SetupFile(const std::string& fileName, std::string folder, std::string_view text, RunLog& log);

  /// The target MIREVO_PARAMETERS. Sections of it may refer to this object, which must outlive them.
  SetupSection target();

  const KdxDocument& document() const { return document_; }
  RunLog& log() { return log_; }
  /// "setup.kdx:14:9"
  std::string place(KdxPosition position) const;
  /// Absolute and normal form of a file name of the setup; blank stays blank.
  std::string resolve(std::string_view fileName) const;
  /// The inverse of resolve() for a file in or below the setup's folder, so that the folder can be moved; others as
  /// they are.
  std::string relative(const std::string& path) const;

 private:
  KdxDocument document_;
  std::string folder_;
  RunLog& log_;
};

/// An open section of the setup: reads its keywords as the keyword table has them, echoes them, and knows where each
/// stands, so that whatever is wrong with a value is reported with its place.
class SetupSection final {
 public:
  SetupSection(SetupFile& file, const KdxSection& node, std::string path, std::string pattern);

  /// Opens a section inside this one and echoes its name. Throws FatalError with "Error: Unable to open section ...".
  SetupSection open(std::string_view name) const;
  std::optional<SetupSection> openIfPresent(std::string_view name) const;
  /// `PARAMETER_12` for the prefix `PARAMETER_`.
  SetupSection openItem(std::string_view prefix, std::size_t number) const;

  /// The section's name in the log, for a section that is taken up again after others.
  void echoName() const;

  /// Reads every keyword of the section into its field. Throws FatalError with "Error: Unable to read keyword ...".
  void read(RunConfig& config, std::size_t item = 0) const;
  /// Reads the count of a list whose items' names begin with `itemPrefix`.
  std::size_t readCount(std::string_view itemPrefix) const;

  /// Ends the run with `message` unless the value is in the keyword's range; the detail says where it stands.
  void check(std::string_view keyword, double value, std::string_view message) const;
  /// Ends the run with `message`; `explanation` follows the keyword's place.
  [[noreturn]] void refuse(std::string_view message, std::string_view keyword, std::string_view explanation) const;
  /// A warning in the log with the keyword's place.
  void warn(std::string_view keyword, std::string_view text) const;

  /// A line below the keyword's echo in the log.
  void note(std::string_view keyword, std::string_view text) const;

  /// The name without its path.
  std::string name() const;
  const std::string& path() const { return path_; }
  /// The keyword's text as the setup has it, without trailing blanks; empty when it is absent.
  std::string written(std::string_view keyword) const;

 private:
  void readRow(const KeywordRow& row, RunConfig& config, std::size_t item) const;
  SetupValue convert(const KeywordRow& row, const KdxKeyword& keyword) const;
  std::string place(std::string_view keyword) const;
  [[noreturn]] void refuseMissing(const KeywordRow& row) const;
  [[noreturn]] void refuseToRead(KdxPosition position, std::string_view keyword, std::string_view explanation) const;
  void echo(std::string_view keyword, const SetupValue& value, bool isDefault) const;
  void take(const KeywordRow& row, const SetupValue& value, bool isDefault, RunConfig& config, std::size_t item) const;

  SetupFile* file_;
  const KdxSection* node_;
  std::string path_;     ///< names below the target, `/` between them
  std::string pattern_;  ///< the same as the keyword table has it
};

}  // namespace mirevo
