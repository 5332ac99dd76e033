#include "common/settings/keyword_row.h"

#include <algorithm>
#include <cmath>
#include <utility>

#include <fmt/format.h>

namespace mirevo {

bool ValueRange::contains(double value) const {
  return std::isfinite(value) && value >= lowest && value <= highest && !(lowestExcluded && value == lowest);
}

std::string ValueRange::text() const {
  const bool hasHighest = std::isfinite(highest);
  if (!std::isfinite(lowest)) return {};
  if (lowestExcluded)
    return fmt::format("greater than {}", lowest) + (hasHighest ? fmt::format(" and at most {}", highest) : "");
  if (!hasHighest) return fmt::format("{} or more", lowest);
  return lowest == highest ? fmt::format("{}", lowest) : fmt::format("{} to {}", lowest, highest);
}

KeywordRow itemCount(int least) {
  return unused({.name = kItemCountKeyword,
                 .defaultValue = least == 0 ? "0" : "",
                 .range = {.lowest = double(least)},
                 .meaning = "Number of item sections; exactly so many are read."},
                KeywordType::integer);
}

KeywordRow unused(KeywordFacts facts, KeywordType type) {
  return {std::move(facts), type};
}

bool isCode(const CodeName& meant, const SetupValue& value) {
  if (const auto* number = std::get_if<std::int32_t>(&value)) return meant.code == *number;
  const auto* name = std::get_if<std::string>(&value);
  return name != nullptr && *name == meant.name;
}

std::string_view nameOfCode(std::span<const CodeName> codes, const SetupValue& value) {
  const auto found =
      std::find_if(codes.begin(), codes.end(), [&value](const CodeName& code) { return isCode(code, value); });
  return found == codes.end() ? std::string_view{} : found->name;
}

}  // namespace mirevo
