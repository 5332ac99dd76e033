#include "common/text.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <numeric>
#include <utility>

#include <fmt/core.h>

#include "common/utf8.h"

namespace mirevo {
namespace {

constexpr std::string_view kBlank = " \t\r\n";

char lowerAscii(char c) {
  return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

/// Whether a number outside the range of a double is too small (and therefore counts as zero) rather than too large
/// (and invalid).
bool isTooSmall(std::string_view number) {
  if (const auto e = number.find_first_of("eE"); e != std::string_view::npos) {
    return e + 1 < number.size() && number[e + 1] == '-';
  }
  return number.find_first_of("123456789") > number.find('.');
}

}  // namespace

std::string_view trimTrailing(std::string_view text) {
  const auto last = text.find_last_not_of(" \t\r");
  return last == std::string_view::npos ? std::string_view{} : text.substr(0, last + 1);
}

std::string_view trim(std::string_view text) {
  const auto first = text.find_first_not_of(kBlank);
  if (first == std::string_view::npos) return {};
  return text.substr(first, text.find_last_not_of(kBlank) - first + 1);
}

std::string toLowerAscii(std::string_view text) {
  std::string lower(text);
  std::transform(lower.begin(), lower.end(), lower.begin(), lowerAscii);
  return lower;
}

bool equalIgnoringCase(std::string_view a, std::string_view b) {
  return std::equal(a.begin(), a.end(), b.begin(), b.end(),
                    [](char x, char y) { return lowerAscii(x) == lowerAscii(y); });
}

std::optional<double> parseReal(std::string_view text) {
  text = trim(text);
  if (!text.empty() && text.front() == '+') {
    text.remove_prefix(1);
    if (!text.empty() && text.front() == '-') return std::nullopt;
  }
  // from_chars would accept "inf" and "nan", which no user means as a value.
  for (const char c : text) {
    const char lower = lowerAscii(c);
    if (!(c >= '0' && c <= '9') && c != '.' && c != '+' && c != '-' && lower != 'e' && lower != 'd') {
      return std::nullopt;
    }
  }
  std::string exponentForm;
  if (const auto d = text.find_first_of("dD"); d != std::string_view::npos) {
    exponentForm = text;
    exponentForm[d] = 'e';
    text = exponentForm;
  }
  double value = 0.0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
  if (end != text.data() + text.size() || text.empty()) return std::nullopt;
  if (error == std::errc::result_out_of_range) return isTooSmall(text) ? std::optional<double>(0.0) : std::nullopt;
  if (error != std::errc{}) return std::nullopt;
  return value;
}

std::optional<std::int32_t> parseInteger(std::string_view text) {
  text = trim(text);
  if (!text.empty() && text.front() == '+') {
    text.remove_prefix(1);
    if (!text.empty() && text.front() == '-') return std::nullopt;
  }
  std::int32_t value = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
  if (error != std::errc{} || end != text.data() + text.size()) return std::nullopt;
  return value;
}

std::string formatReal(double value) {
  if (std::isnan(value)) return "NaN";
  if (std::isinf(value)) return value > 0 ? "Inf" : "-Inf";
  return fmt::format("{}", value);
}

std::string countText(std::size_t count, std::string_view one, std::string_view more) {
  if (count == 1) return fmt::format("1 {}", one);
  return more.empty() ? fmt::format("{} {}s", count, one) : fmt::format("{} {}", count, more);
}

std::string withNumber(std::string_view text, std::int64_t number) {
  std::string result(text);
  if (const auto position = result.find('%'); position != std::string::npos) {
    result.replace(position, 1, std::to_string(number));
  }
  return result;
}

std::size_t editDistance(std::string_view a, std::string_view b) {
  const auto same = [&](std::size_t i, std::size_t j) { return lowerAscii(a[i]) == lowerAscii(b[j]); };
  std::vector<std::size_t> beforeLast;
  std::vector<std::size_t> last;
  std::vector<std::size_t> row(b.size() + 1);
  std::iota(row.begin(), row.end(), std::size_t{0});
  for (std::size_t i = 1; i <= a.size(); ++i) {
    beforeLast = std::exchange(last, row);
    row[0] = i;
    for (std::size_t j = 1; j <= b.size(); ++j) {
      row[j] = std::min({last[j] + 1, row[j - 1] + 1, last[j - 1] + (same(i - 1, j - 1) ? 0 : 1)});
      const bool isSwap = i > 1 && j > 1 && same(i - 1, j - 2) && same(i - 2, j - 1);
      if (isSwap) row[j] = std::min(row[j], beforeLast[j - 2] + 1);
    }
  }
  return row[b.size()];
}

std::optional<std::string> nearestName(std::string_view name, std::span<const std::string> candidates) {
  if (name.empty()) return std::nullopt;  // it is one edit from every name of one character
  const std::size_t limit = std::max<std::size_t>(1, name.size() / 3);
  std::optional<std::string> nearest;
  std::size_t nearestDistance = limit + 1;
  std::size_t nearestGap = 0;
  for (const std::string& candidate : candidates) {
    const std::size_t lengthGap =
        candidate.size() > name.size() ? candidate.size() - name.size() : name.size() - candidate.size();
    if (lengthGap > nearestDistance) continue;
    // Of equally near ones that of the same length: "=<" is "<=" rather than "<".
    const std::size_t distance = editDistance(name, candidate);
    const bool haveNothingInCommon = distance == std::max(name.size(), candidate.size());
    if (distance > limit || haveNothingInCommon ||
        std::pair(distance, lengthGap) >= std::pair(nearestDistance, nearestGap))
      continue;
    nearest = candidate;
    nearestDistance = distance;
    nearestGap = lengthGap;
  }
  return nearest;
}

std::string quotedForMessage(std::string_view text) {
  constexpr std::size_t kLongest = 60;
  std::size_t end = std::min(text.size(), kLongest);
  while (end > 0 && end < text.size() && isInsideCharacter(text[end])) --end;
  std::string quoted = "\"";
  for (const char c : text.substr(0, end)) quoted += isControlCharacter(c) || c == '\x7F' ? '?' : c;
  return quoted + (end < text.size() ? "...\"" : "\"");
}

std::vector<std::string_view> splitAt(std::string_view text, char separator, std::size_t mostParts) {
  std::vector<std::string_view> parts;
  std::size_t end = 0;
  while (parts.size() + 1 < mostParts && (end = text.find(separator)) != std::string_view::npos) {
    parts.push_back(text.substr(0, end));
    text.remove_prefix(end + 1);
  }
  parts.push_back(text);
  return parts;
}

std::vector<std::string_view> splitLines(std::string_view text) {
  std::vector<std::string_view> lines;
  while (!text.empty()) {
    const auto end = text.find('\n');
    std::string_view line = text.substr(0, end);
    text.remove_prefix(end == std::string_view::npos ? text.size() : end + 1);
    if (!line.empty() && line.back() == '\r') line.remove_suffix(1);
    lines.push_back(line);
  }
  return lines;
}

std::string onOneLine(std::string_view text) {
  std::string line(text);
  std::replace_if(
      line.begin(), line.end(), [](char c) { return static_cast<unsigned char>(c) < ' '; }, ' ');
  return line;
}

std::string withoutLineEnds(std::string_view text) {
  std::string line(text);
  std::replace(line.begin(), line.end(), '\n', ' ');
  return line;
}

std::string columnName(std::string_view name) {
  std::string harmless = onOneLine(trim(name));
  for (char& c : harmless) {
    if (c == '#') c = '_';   // would start a comment in the middle of the header row
    if (c == '"') c = '\'';  // would open a quoted field that swallows its neighbours
  }
  return harmless;
}

}  // namespace mirevo
