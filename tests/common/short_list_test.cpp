#include "common/short_list.h"

#include <utility>

#include <gtest/gtest.h>

namespace mirevo {
namespace {

TEST(ShortList, NamesAsManyAsItMayAndCountsTheOthers) {
  const std::pair<int, const char*> cases[] = {{0, ""}, {1, "a"}, {2, "a, b"}, {3, "a, b and 1 more"}};
  for (const auto& [count, text] : cases) {
    ShortList list(2);
    for (int i = 0; i < count; ++i) list.add(std::string(1, static_cast<char>('a' + i)));
    EXPECT_EQ(list.text(), text);
    EXPECT_EQ(list.count(), static_cast<std::size_t>(count));
    EXPECT_EQ(list.isEmpty(), count == 0);
  }
}

}  // namespace
}  // namespace mirevo
