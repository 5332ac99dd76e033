#include "common/short_list.h"

#include <fmt/format.h>

namespace mirevo {

void ShortList::add(std::string_view item) {
  if (++count_ > most_) return;
  if (count_ > 1) named_ += ", ";
  named_ += item;
}

std::string ShortList::text() const {
  return count_ > most_ ? fmt::format("{} and {} more", named_, count_ - most_) : named_;
}

}  // namespace mirevo
