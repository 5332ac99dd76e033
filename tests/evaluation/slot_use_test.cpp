#include "evaluation/slot_use.h"

#include <tuple>
#include <vector>

#include <gtest/gtest.h>

namespace mirevo {
namespace {

TEST(SlotUse, TellsTheShareOfTheSlotsTimeInWhichModelsRan) {
  SlotUse use;
  EXPECT_EQ(use.text(2, "slots"), "");
  use.runStarted(10.0);
  EXPECT_EQ(use.text(2, "slots"), "");
  use.runStarted(10.0);
  use.runEnded(12.0);
  use.runEnded(14.0);
  use.runStarted(16.0);
  use.runEnded(20.0);
  use.runStarted(30.0);  // has not ended, and does not count
  EXPECT_DOUBLE_EQ(*use.busyShare(2), 10.0 / 20.0);
  EXPECT_EQ(use.text(2, "slots"),
            "The 2 slots were busy for 50 % of the time between the first and the last model run");
  EXPECT_EQ(use.text(1, "slots"), "");
}

TEST(SlotUse, NamesTheNumbersOfSlotsThatDivideTheBatchesEvenly) {
  // the batches, the slots, the evenness, the end of the text
  const std::tuple<std::vector<int>, int, double, const char*> cases[] = {
      {{12, 12, 12},
       8,
       0.75,
       "; its batches of 12 model runs fill at most 75 % of it, and 2, 3, 4, 6 or 12 slots would divide them evenly"},
      {{12, 12}, 6, 1.0, " model run"},
      {{1000}, 8, 1.0, " model run"},
      {{20, 12, 12},
       5,
       44.0 / 50.0,
       "; its batches of 12 to 20 model runs fill at most 88 % of it, and 2, 3 or 4 slots would divide them evenly"},
      {{7},
       4,
       7.0 / 8.0,
       "; its batches of 7 model runs fill at most 88 % of it, and 7 slots would divide them evenly"},
      {{1, 1, 1}, 4, 0.25, " model run"},
  };
  for (const auto& [batches, slots, evenness, end] : cases) {
    SlotUse use;
    double now = 0.0;
    for (const int runs : batches) {
      for (int i = 0; i < runs; ++i) {
        use.runStarted(now);
        if (i == 0) now += 1.0;  // and the others no time
        use.runEnded(now);
      }
      use.endBatch();
    }
    EXPECT_DOUBLE_EQ(use.evenness(slots), evenness);
    EXPECT_TRUE(use.text(slots, "slots").ends_with(end)) << use.text(slots, "slots");
    use.runStarted(now);
    use.endPart();
    use.runEnded(now + 1.0);
    EXPECT_TRUE(use.text(slots, "slots").ends_with(" model run")) << "not all of the runs were in batches";
  }
}

}  // namespace
}  // namespace mirevo
