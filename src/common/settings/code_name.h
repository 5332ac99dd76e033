#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <string_view>
#include <type_traits>

namespace mirevo {

/// A value of a coded setting: its number, if it has one, and its name.
struct CodeName {
  std::optional<std::int32_t> code;
  std::string_view name;
};

/// The name of a code; empty for a code that is not among them.
constexpr std::string_view codeName(std::span<const CodeName> names, std::int32_t code) {
  for (const CodeName& value : names) {
    if (value.code == code) return value.name;
  }
  return {};
}
template <class Enum>
requires std::is_enum_v<Enum>
constexpr std::string_view codeName(std::span<const CodeName> names, Enum code) {
  return codeName(names, static_cast<std::int32_t>(code));
}

}  // namespace mirevo
