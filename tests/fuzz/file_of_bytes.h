#pragma once

#include <cstdint>
#include <string>
#include <sys/mman.h>
#include <unistd.h>

#include "require.h"

/// A file in memory, for what reads by name; always the same one.
inline std::string fileOfBytes(const std::uint8_t* data, std::size_t size) {
  static const int file = ::memfd_create("fuzz.nc", 0);
  require(file >= 0 && ::ftruncate(file, 0) == 0);
  require(::pwrite(file, data, size, 0) == static_cast<ssize_t>(size));
  return "/proc/self/fd/" + std::to_string(file);
}
