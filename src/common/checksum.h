#pragma once

#include <cstdint>
#include <string_view>

namespace mirevo {

/// The 64-bit FNV-1a hash of Fowler, Noll and Vo: the same number for the same bytes on every machine. It detects
/// changed or cut-off content, but does not protect against deliberate manipulation.
constexpr std::uint64_t checksumOf(std::string_view bytes) {
  std::uint64_t hash = 0xcbf29ce484222325ULL;
  for (const char byte : bytes) hash = (hash ^ static_cast<unsigned char>(byte)) * 0x100000001b3ULL;
  return hash;
}

}  // namespace mirevo
