#include "parameters/template_doubts.h"

#include <string_view>
#include <unordered_set>

#include <fmt/core.h>

#include "common/take_text.h"
#include "common/text.h"
#include "common/utf8.h"
#include "parameters/template_lines.h"

namespace mirevo {
namespace {

constexpr std::string_view kLikelyDelimiters = "!$#%&@~^|*?";
constexpr char kNoDelimiter = '\0';

/// The text behind the delimiter in the first line of a template.
std::string_view behindDelimiter(std::string_view text) {
  std::string_view line = text.substr(0, text.find('\n'));
  takeText(line, kByteOrderMark);
  line = trim(line);
  return line.empty() ? line : line.substr(1);
}

using Names = std::unordered_set<std::string_view>;

Names namesOf(std::span<const ModelParameter> parameters) {
  Names names;
  for (const ModelParameter& parameter : parameters) names.insert(trimBlanks(parameter.name));
  names.erase("");
  return names;
}

/// The first name between two equal marks other than `delimiter`, with the marks; empty if there is none.
std::string_view markedNameIn(std::string_view line, const Names& names, char delimiter) {
  for (std::size_t open = line.find_first_of(kLikelyDelimiters); open != std::string_view::npos;
       open = line.find_first_of(kLikelyDelimiters, open + 1)) {
    const std::size_t close = line.find(line[open], open + 1);
    if (line[open] == delimiter || close == std::string_view::npos) continue;
    if (names.contains(trimBlanks(line.substr(open + 1, close - open - 1)))) return line.substr(open, close - open + 1);
  }
  return {};
}

/// Whether a delimiter line may have been forgotten: the delimiter is the first character of a word or a number, or a
/// placeholder with another one follows it.
bool lacksDelimiterLine(std::string_view text, std::span<const ModelParameter> parameters) {
  const std::string_view behind = behindDelimiter(text);
  if (behind.empty()) return false;
  const std::string first = toLowerAscii(std::string_view(behind.data() - 1, 1));
  return (first >= "a" && first <= "z") || (first >= "0" && first <= "9") ||
         !markedNameIn(text.substr(0, text.find('\n')), namesOf(parameters), kNoDelimiter).empty();
}

/// A parameter's name between two equal characters that may be delimiters.
struct FoundName {
  std::size_t line = 0;  ///< from 1
  std::string marked;    ///< "$Depth  $"
};

/// The first name whose marks are not `delimiter`, behind the delimiter line if there is one.
std::optional<FoundName> findMarkedName(std::string_view text, std::span<const ModelParameter> parameters,
                                        char delimiter = kNoDelimiter) {
  const Names names = namesOf(parameters);
  std::size_t number = 0;
  for (const std::string_view line : splitLines(text)) {
    if (++number == 1 && delimiter != kNoDelimiter) continue;
    if (const std::string_view marked = markedNameIn(line, names, delimiter); !marked.empty()) {
      return FoundName{number, std::string(marked)};
    }
  }
  return std::nullopt;
}

/// The delimiter of a delimiter template, which has one.
char delimiterOf(std::string_view text) {
  takeText(text, kByteOrderMark);
  return trim(text).front();
}

}  // namespace

std::vector<std::string> templateDoubts(const ParameterTemplate& parameterTemplate, TemplateType type,
                                        std::string_view text, std::span<const ModelParameter> parameters) {
  const std::string& name = parameterTemplate.name();
  std::vector<std::string> doubts;
  if (type == TemplateType::numericId) {
    if (const auto found = findMarkedName(text, parameters)) {
      doubts.push_back(
          fmt::format("{}:{}: {} is copied as it is: FileType = 0 reads names between delimiters, 1 reads ID values",
                      name, found->line, quotedForMessage(found->marked)));
    }
  } else {
    const auto ofPest = delimiterOfPest(text.substr(0, text.find('\n')));
    if (const std::string_view behind = behindDelimiter(text); !behind.empty() && !ofPest) {
      doubts.push_back(
          fmt::format("{}:1: the first line holds the delimiter, {}, and does not reach the model: {} "
                      "behind it is ignored{}",
                      name, quotedForMessage(std::string_view(behind.data() - 1, 1)), quotedForMessage(trim(behind)),
                      lacksDelimiterLine(text, parameters) ? "; was a line for the delimiter forgotten?" : ""));
    }
    const char delimiter = ofPest ? *ofPest : delimiterOf(text);
    if (const auto found = findMarkedName(text, parameters, delimiter)) {
      doubts.push_back(fmt::format("{}:{}: {} is copied as it is: the delimiter in the first line is {}", name,
                                   found->line, quotedForMessage(found->marked), delimiter));
    }
    if (const auto found = findIdValue(text, parameters)) {
      doubts.push_back(fmt::format(
          "{}:{}: the ID value {} is no placeholder here: FileType = 1 reads ID values, any other names between "
          "delimiters",
          name, found->line, found->token));
    }
  }
  if (parameterTemplate.parametersNamed().empty()) {
    doubts.push_back(fmt::format("{}: there is no {} in it: the parameter file is the same in every model run", name,
                                 type == TemplateType::numericId ? "ID value" : "placeholder"));
  }
  return doubts;
}

std::string hintOnMisreadTemplate(TemplateType type, std::string_view text,
                                  std::span<const ModelParameter> parameters) {
  if (type == TemplateType::numericId) {
    const auto found = findMarkedName(text, parameters);
    if (!found) return {};
    return fmt::format("\nline {} has {}: FileType = 0 reads names between delimiters, 1 reads ID values", found->line,
                       quotedForMessage(found->marked));
  }
  if (const auto found = findIdValue(text, parameters)) {
    return fmt::format("\nline {} has the ID value {}: FileType = 1 reads ID values", found->line, found->token);
  }
  if (!lacksDelimiterLine(text, parameters)) return {};
  return fmt::format("\nthe delimiter is {}, the first character of the first line: was a line for it forgotten?",
                     quotedForMessage(std::string_view(behindDelimiter(text).data() - 1, 1)));
}

}  // namespace mirevo
