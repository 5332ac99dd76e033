#include "parameters/template_file.h"

#include <algorithm>
#include <cassert>
#include <cerrno>
#include <cstring>
#include <sys/stat.h>

#include <fmt/core.h>

#include "common/encoding.h"
#include "common/fatal_error.h"
#include "common/files.h"
#include "common/take_text.h"
#include "common/text.h"
#include "common/utf8.h"
#include "parameters/placeholder_width.h"
#include "parameters/template_lines.h"
#include "parameters/value_format.h"

namespace mirevo {
namespace {

bool isDigit(char c) {
  return c >= '0' && c <= '9';
}

/// The delimiter in the first line of a template.
char readDelimiter(std::string_view templateName, std::string_view line) {
  const auto ofPest = delimiterOfPest(line);
  takeText(line, kByteOrderMark);
  line = trim(line);
  const auto refuse = [templateName](std::string_view reason) {
    fatalError(fmt::format("Error: Delimiter not defined in template file {}", templateName), reason);
  };
  if (ofPest) line = line.substr(line.size() - 1);
  if (line.empty()) refuse("the first line of a template holds the character that opens and closes a placeholder");
  const char delimiter = line.front();
  if (isDigit(delimiter) || std::string_view("+-.E").find(delimiter) != std::string_view::npos) {
    refuse(fmt::format("\"{}\" is a character of numbers and cannot mark placeholders; take ! or $ or #", delimiter));
  }
  if (line.size() > 1 && static_cast<unsigned char>(delimiter) >= 0xC2 && isInsideCharacter(line[1])) {
    refuse("the delimiter must be a single-byte character, such as ! or $ or #");
  }
  return delimiter;
}

/// Index of the first parameter with this name, without trailing blanks; the number of parameters if there is none.
std::size_t findParameter(std::string_view asWritten, std::span<const ModelParameter> parameters, bool ignoresCase) {
  const std::string name = decodeText(asWritten).text;  // a template may be Latin-1; the setup is UTF-8 here
  const auto found = std::find_if(parameters.begin(), parameters.end(), [&](const ModelParameter& parameter) {
    const std::string_view known = trimBlanks(parameter.name);
    return ignoresCase ? equalIgnoringCase(known, name) : known == name;
  });
  return static_cast<std::size_t>(found - parameters.begin());
}

std::string withVisibleTabs(std::string_view text) {
  std::string shown;
  for (const char c : text) shown += c == '\t' ? std::string("\\t") : std::string(1, c);
  return shown;
}

[[noreturn]] void failUnknownName(std::string_view templateName, int lineNumber, std::size_t column, bool paired,
                                  char delimiter, std::string_view name, std::span<const ModelParameter> parameters) {
  std::string detail = fmt::format("{}:{}:{}: ", templateName, lineNumber, column + 1);
  if (!paired) {
    detail += fmt::format("the delimiter {} has no partner in its line", delimiter);
  } else {
    detail += fmt::format("no parameter has the name {}, which is between two {} here",
                          quotedForMessage(withVisibleTabs(name)), delimiter);
    std::vector<std::string> names;
    for (const ModelParameter& parameter : parameters) names.emplace_back(trimTrailing(parameter.name));
    if (name.find('\t') != std::string_view::npos) {
      detail += "\nIt has a tab, written as \\t in the message: only blanks around a name are left out";
    }
    if (const auto nearest = nearestName(name, names)) detail += fmt::format("\ndid you mean \"{}\"?", *nearest);
  }
  // The fixed text has the name twice.
  const std::string shown = withVisibleTabs(name);
  fatalError(fmt::format("Error: Parameter name {} in template file {} invalid", shown, shown), detail);
}

void trimBlanksAtEnd(std::string& text) {
  text.resize(text.find_last_not_of(' ') + 1);
}

}  // namespace

ParameterTemplate::ParameterTemplate(std::string_view templateName, std::string_view text,
                                     std::span<const ModelParameter> parameters, bool isConverted)
    : templateName_(templateName), pieces_(1) {
  const std::vector<std::string_view> lines = templateLines(templateName, text);
  const std::string_view head = lines.empty() ? std::string_view{} : lines.front();
  delimiter_ = readDelimiter(templateName, head);
  isOfPest_ = delimiterOfPest(head).has_value();
  for (std::size_t i = 1; i < lines.size(); ++i) {
    takeLine(lines[i], static_cast<int>(i) + (isConverted ? 0 : 1), parameters);
  }
}

void ParameterTemplate::takeLine(std::string_view line, int lineNumber, std::span<const ModelParameter> parameters) {
  std::size_t copied = 0;
  for (std::size_t open = line.find(delimiter_); open != std::string_view::npos; open = line.find(delimiter_, copied)) {
    const std::size_t close = line.find(delimiter_, open + 1);
    const bool paired = close != std::string_view::npos;
    std::string_view name = paired ? trimBlanks(line.substr(open + 1, close - open - 1)) : std::string_view{};
    if (isOfPest_) name = trim(name);
    const std::size_t parameter = name.empty() ? parameters.size() : findParameter(name, parameters, isOfPest_);
    if (parameter == parameters.size()) {
      failUnknownName(templateName_, lineNumber, open, paired, delimiter_, name, parameters);
    }
    pieces_.back() += line.substr(copied, open - copied);
    const auto width = static_cast<int>(characterCount(line.substr(open, close - open + 1)));
    const bool isWhole = parameters[parameter].transformationType == TransformationType::integer;
    const ValueForm form = !isOfPest_ ? ValueForm::cut : isWhole ? ValueForm::whole : ValueForm::rounded;
    placeholders_.push_back({parameter, {width, form}, lineNumber});
    pieces_.emplace_back();
    copied = close + 1;
  }
  pieces_.back() += line.substr(copied);
  pieces_.back() += '\n';
}

std::string ParameterTemplate::fill(std::span<const double> modelValues) const {
  std::string content = pieces_.front();
  for (std::size_t i = 0; i < placeholders_.size(); ++i) {
    assert(placeholders_[i].parameter < modelValues.size());
    content += FormatValueForPlaceholder(modelValues[placeholders_[i].parameter], placeholders_[i].field);
    // Removes the blanks after the value of a wide placeholder at the end of a line.
    if (pieces_[i + 1].starts_with('\n')) trimBlanksAtEnd(content);
    content += pieces_[i + 1];
  }
  return content;
}

std::string ParameterTemplate::unwritableValue(std::span<const double> modelValues,
                                               std::span<const ModelParameter> parameters) const {
  const auto found = std::find_if(placeholders_.begin(), placeholders_.end(), [modelValues](const Placeholder& one) {
    const double value = modelValues[one.parameter];
    return one.field.form == ValueForm::cut ? !isWritable(value) : !valueAsWritten(value, one.field);
  });
  if (found == placeholders_.end()) return {};
  return fmt::format("the value {} of parameter \"{}\" cannot be written in its field, {}:{}",
                     formatReal(modelValues[found->parameter]), trimTrailing(parameters[found->parameter].name),
                     templateName_, found->line);
}

std::vector<std::size_t> ParameterTemplate::parametersNamed() const {
  std::vector<std::size_t> indices;
  for (const Placeholder& placeholder : placeholders_) indices.push_back(placeholder.parameter);
  std::sort(indices.begin(), indices.end());
  indices.erase(std::unique(indices.begin(), indices.end()), indices.end());
  return indices;
}

void ParameterTemplate::raiseToWidest(std::vector<ValueField>& fields) const {
  for (const Placeholder& placeholder : placeholders_) {
    ValueField& field = fields[placeholder.parameter];
    if (placeholder.field.width > field.width) field = placeholder.field;
  }
}

std::vector<std::string> ParameterTemplate::narrowPlaceholderWarnings(
    std::span<const ModelParameter> parameters) const {
  std::vector<std::string> warnings;
  for (std::size_t i = 0; i < placeholders_.size(); ++i) {
    const Placeholder& placeholder = placeholders_[i];
    const ModelParameter& parameter = parameters[placeholder.parameter];
    const std::string where = fmt::format("{}:{}: the placeholder of parameter \"{}\"", templateName_, placeholder.line,
                                          trimTrailing(parameter.name));
    if (const std::string loss = describePrecisionLoss(parameter, placeholder.field); !loss.empty()) {
      warnings.push_back(where + loss);
    }
    const std::string& before = pieces_[i];
    const std::string& after = pieces_[i + 1];
    const bool touchedBefore = !before.empty() && (isDigit(before.back()) || before.ends_with('.') ||
                                                   before.ends_with('+') || before.ends_with('-'));
    const bool touchedAfter = !after.empty() && isDigit(after.front());
    if (touchedBefore || touchedAfter) {
      warnings.push_back(where +
                         fmt::format(" is touched by \"{}\", which the model may read as a part of its value: put "
                                     "a blank between them",
                                     touchedBefore ? before.back() : after.front()));
    }
  }
  return warnings;
}

std::vector<ValueField> widestPlaceholders(std::span<const ParameterTemplate> templates, std::size_t parameterCount) {
  std::vector<ValueField> fields(parameterCount);
  for (const ParameterTemplate& each : templates) each.raiseToWidest(fields);
  return fields;
}

void WriteParameterFile(const std::string& path, const ParameterTemplate& parameterTemplate,
                        std::span<const double> modelValues) {
  const std::string trimmed(trimTrailing(path));
  struct stat status {};
  std::string reason;
  if (::stat(trimmed.c_str(), &status) != 0) {
    reason = std::strerror(errno);
  } else if (!S_ISREG(status.st_mode)) {
    reason = "not a regular file";
  } else if (writeByUnlinkAndCreate(trimmed, parameterTemplate.fill(modelValues), status.st_mode, reason)) {
    return;
  }
  fatalError(fmt::format("Error: Unable to open {}", trimmed), reason);
}

}  // namespace mirevo
