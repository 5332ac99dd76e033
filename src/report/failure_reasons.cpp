#include "report/failure_reasons.h"

#include <algorithm>
#include <unordered_map>

#include <fmt/core.h>

#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::string_view kEvaluation = "Evaluation No. ";
constexpr std::string_view kOutput = "   | ";
constexpr std::size_t kMostExampleLines = 6;

/// The reason with each number in it as one "0".
std::string withoutNumbers(std::string_view reason) {
  std::string text;
  for (const char c : reason) {
    const bool isDigit = c >= '0' && c <= '9';
    if (!isDigit) {
      text += c;
    } else if (text.empty() || text.back() != '0') {
      text += '0';
    }
  }
  return text;
}

/// The evaluation's number and the last lines that its batch printed; `lines` begins behind the reason.
std::string exampleOf(std::string_view number, std::string_view reason, std::vector<std::string_view> output) {
  std::string text = fmt::format("Evaluation {}: {}", number, reason);
  if (output.size() > kMostExampleLines) output.erase(output.begin(), output.end() - kMostExampleLines);
  for (const std::string_view line : output) text.append("\n").append(line);
  return text;
}

}  // namespace

std::vector<FailureReason> readFailureReasons(std::string_view text, std::string_view setupName) {
  const std::vector<std::string_view> lines = splitLines(text);
  if (lines.empty() || lines.front() != fmt::format("# Failed evaluations of {}", setupName)) return {};
  std::vector<FailureReason> reasons;
  std::unordered_map<std::string, std::size_t> places;
  for (std::size_t i = 1; i + 1 < lines.size(); ++i) {
    if (!lines[i].starts_with(kEvaluation)) continue;
    const std::string_view reason = trim(lines[i + 1]);
    const auto [place, isNew] = places.emplace(withoutNumbers(reason), reasons.size());
    if (isNew) {
      std::vector<std::string_view> output;
      for (std::size_t k = i + 2; k < lines.size() && !lines[k].empty(); ++k) {
        if (lines[k].starts_with(kOutput)) output.push_back(lines[k].substr(kOutput.size()));
      }
      const std::string_view heading = lines[i].substr(kEvaluation.size());
      const std::string_view number = heading.substr(0, heading.find(' '));  // its kind may stand behind it
      reasons.push_back({std::string(reason), 0, exampleOf(number, reason, std::move(output))});
    }
    ++reasons[place->second].count;
  }
  std::stable_sort(reasons.begin(), reasons.end(), [](const auto& a, const auto& b) { return a.count > b.count; });
  return reasons;
}

}  // namespace mirevo
