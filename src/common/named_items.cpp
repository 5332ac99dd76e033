#include "common/named_items.h"

#include <fmt/format.h>

#include "common/text.h"

namespace mirevo {

bool isSameName(std::string_view a, std::string_view b) {
  return trim(a) == trim(b);
}

std::vector<std::size_t> itemsNamed(std::string_view written, std::span<const std::string> names) {
  std::vector<std::size_t> exact;
  std::vector<std::size_t> similar;
  for (std::size_t i = 0; i < names.size(); ++i) {
    if (isSameName(names[i], written)) exact.push_back(i);
    if (equalIgnoringCase(trim(names[i]), trim(written))) similar.push_back(i);
  }
  return exact.empty() ? similar : exact;
}

std::string ambiguityText(std::string_view written, std::span<const std::string> names,
                          std::span<const std::size_t> meant) {
  std::vector<std::string> choices;
  for (const std::size_t i : meant) choices.push_back(quotedForMessage(trim(names[i])));
  const bool areSame = isSameName(names[meant.front()], written);
  return fmt::format("{} may be each of {}{}", quotedForMessage(trim(written)), fmt::join(choices, ", "),
                     areSame ? ": give them different names" : ", which differ by case alone: write one of them");
}

}  // namespace mirevo
