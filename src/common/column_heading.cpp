#include "common/column_heading.h"

#include <algorithm>

#include <fmt/core.h>

#include "common/text.h"

namespace mirevo {

std::string columnHeading(const std::string& name, std::span<const std::string> taken) {
  const std::string plain = columnName(name);
  std::string unique = plain;
  for (int i = 2; std::ranges::find(taken, unique) != taken.end(); ++i) unique = fmt::format("{} ({})", plain, i);
  return unique;
}

}  // namespace mirevo
