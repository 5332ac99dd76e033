#pragma once

#include <cstddef>
#include <cstdint>
#include <sys/mman.h>

namespace mirevo {

/// Tells the system that all of this memory, which has been reserved and not yet filled, is about to be: in large pages
/// it then takes hundreds of times fewer faults. Does nothing for less than some of these pages.
inline void preferLargePages(void* memory, std::size_t size) {
  constexpr std::size_t kLeast = std::size_t{8} << 20;
  constexpr std::uintptr_t kPage = 4096;
  if (size < kLeast) return;
  const std::size_t before = (kPage - reinterpret_cast<std::uintptr_t>(memory) % kPage) % kPage;
  const std::size_t whole = (size - before) / kPage * kPage;
  ::madvise(static_cast<char*>(memory) + before, whole, MADV_HUGEPAGE);  // where there are none, nothing is lost
}

/// std::vector::reserve() for memory that is about to be filled.
template <class Vector>
void reserveToFill(Vector& vector, std::size_t count) {
  vector.reserve(count);
  preferLargePages(vector.data(), vector.capacity() * sizeof(typename Vector::value_type));
}

}  // namespace mirevo
