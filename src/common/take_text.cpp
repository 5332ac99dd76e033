#include "common/take_text.h"

#include <algorithm>
#include <charconv>

namespace mirevo {

bool takeText(std::string_view& text, std::string_view front) {
  if (!text.starts_with(front)) return false;
  text.remove_prefix(front.size());
  return true;
}

bool isDigits(std::string_view text) {
  return !text.empty() && text.find_first_not_of("0123456789") == std::string_view::npos;
}

std::string_view takeDigits(std::string_view& text, std::size_t least, std::size_t most) {
  const std::string_view digits = text.substr(0, std::min({text.find_first_not_of("0123456789"), text.size(), most}));
  if (digits.size() < least) return {};
  text.remove_prefix(digits.size());
  return digits;
}

std::optional<std::int64_t> takeNumber(std::string_view& text, std::size_t least, std::size_t most) {
  std::string_view rest = text;
  const std::string_view digits = takeDigits(rest, least, most);
  std::int64_t number = 0;
  if (std::from_chars(digits.data(), digits.data() + digits.size(), number).ec != std::errc{}) return std::nullopt;
  text = rest;
  return number;
}

}  // namespace mirevo
