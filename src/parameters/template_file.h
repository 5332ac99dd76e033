#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "common/settings/code_name.h"
#include "parameters/model_parameter.h"
#include "parameters/value_format.h"

namespace mirevo {

inline constexpr char kConvertedDelimiter = '!';          ///< delimiter of a converted numeric-ID template
inline constexpr std::size_t kMaximumLineLength = 50000;  ///< of a template line, in bytes

/// How a template marks values; any other number also means a delimiter template.
enum class TemplateType : std::int32_t { delimiter = 0, numericId = 1 };
inline constexpr CodeName kTemplateTypeNames[] = {{0, "delimiter"}, {1, "numeric ID"}};

/// One model parameter file of the setup. File names are absolute, in or below the base folder.
struct ParameterFileItem {
  TemplateType templateType = TemplateType::delimiter;
  std::string paramFileName;
  std::string templateFileName;
};

/// The key by which ID values are compared: the value in units of 1e-37, computed in 64 bits with the single-precision
/// constants 1.0e37 and 0.1. Empty if it does not fit into 32 bits: such a value is not an ID value.
std::optional<std::int32_t> idKey(double value);

/// A parameter's ID value in a text.
struct FoundIdValue {
  std::size_t line = 0;  ///< from 1
  std::string token;
};
/// The first ID value of a parameter; 0 counts as none.
std::optional<FoundIdValue> findIdValue(std::string_view text, std::span<const ModelParameter> parameters);

/// Converts a numeric-ID template into a delimiter template, with its delimiter line. `templateName` is used in
/// messages. Throws FatalError for an ID value that no parameter has, for a token that ends like an ID value but is not
/// a number, and for a line that is too long.
///
/// Deliberate: an ID value that begins in column 1 keeps its first character in front of the placeholder.
std::string ConvertIdTemplate(std::string_view templateName, std::string_view text,
                              std::span<const ModelParameter> parameters);

/// A delimiter template, or one of PEST (`ptf ~` in its first line), split into pieces once, so that writing a
/// parameter file takes one pass over them.
class ParameterTemplate final {
 public:
  /// Throws FatalError for a text without a delimiter in its first line, for a placeholder that names no parameter, and
  /// for a line that is too long. If several parameters have the same name, the first is taken; trailing blanks of a
  /// name do not count; in a template of PEST blanks before a name and letter case do not, either. For a converted
  /// template line numbers in messages do not count the added delimiter line.
  ParameterTemplate(std::string_view templateName, std::string_view text, std::span<const ModelParameter> parameters,
                    bool isConverted = false);

  /// As given, for messages.
  const std::string& name() const { return templateName_; }

  /// The parameter file's content for a full parameter vector. Every line ends in LF and has no trailing blanks.
  std::string fill(std::span<const double> modelValues) const;

  /// Which value cannot be written in its field, and where that is; empty when all can.
  std::string unwritableValue(std::span<const double> modelValues, std::span<const ModelParameter> parameters) const;

  /// 0-based indices of the parameters that the template names, ascending, each once.
  std::vector<std::size_t> parametersNamed() const;

  /// Replaces `fields`, one per parameter, by wider placeholders.
  void raiseToWidest(std::vector<ValueField>& fields) const;

  /// One warning per placeholder in which values between the parameter's bounds keep fewer than four significant
  /// digits, with the width to use, and one per placeholder next to a digit or sign, since the model may read both as
  /// one number.
  std::vector<std::string> narrowPlaceholderWarnings(std::span<const ModelParameter> parameters) const;

 private:
  struct Placeholder {
    std::size_t parameter = 0;  ///< 0-based
    ValueField field = 0;
    int line = 0;  ///< in the template, from 1
  };
  void takeLine(std::string_view line, int lineNumber, std::span<const ModelParameter> parameters);

  std::string templateName_;
  char delimiter_ = '\0';
  bool isOfPest_ = false;
  std::vector<std::string> pieces_;  ///< text before, between and after the placeholders
  std::vector<Placeholder> placeholders_;
};

/// By parameter, its widest placeholder in any of the templates; of width 0: it has none.
std::vector<ValueField> widestPlaceholders(std::span<const ParameterTemplate> templates, std::size_t parameterCount);

/// Rewrites an existing parameter file, keeping its mode. Throws FatalError with "Error: Unable to open " and the path,
/// and the system's reason below.
void WriteParameterFile(const std::string& path, const ParameterTemplate& parameterTemplate,
                        std::span<const double> modelValues);

}  // namespace mirevo
