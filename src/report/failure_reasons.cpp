#include "report/failure_reasons.h"

#include <algorithm>
#include <unordered_map>

#include <fmt/core.h>

#include "common/text.h"

namespace mirevo {
namespace {

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

/// On one line.
std::string reasonOf(const FailureRow& row) {
  return withoutLineEnds(trim(row.failure.reason));
}

/// The evaluation's number and the last lines that its batch printed.
std::string exampleOf(const FailureRow& row) {
  std::string text = fmt::format("Evaluation {}: {}", row.number, reasonOf(row));
  const std::vector<std::string>& output = row.failure.lastOutput;
  const std::size_t first = output.size() - std::min(output.size(), kMostExampleLines);
  for (const std::string& line : std::span(output).subspan(first)) {
    text += '\n';
    text += line.ends_with('\r') ? std::string_view(line).substr(0, line.size() - 1) : std::string_view(line);
  }
  return text;
}

}  // namespace

std::vector<FailureReason> groupFailures(std::span<const FailureRow> failures) {
  std::vector<FailureReason> reasons;
  std::unordered_map<std::string, std::size_t> places;
  for (const FailureRow& row : failures) {
    const std::string reason = reasonOf(row);
    const auto [place, isNew] = places.emplace(withoutNumbers(reason), reasons.size());
    if (isNew) reasons.push_back({reason, 0, exampleOf(row)});
    ++reasons[place->second].count;
  }
  std::stable_sort(reasons.begin(), reasons.end(), [](const auto& a, const auto& b) { return a.count > b.count; });
  return reasons;
}

}  // namespace mirevo
