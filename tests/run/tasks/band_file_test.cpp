#include "run/tasks/band_file.h"

#include <limits>

#include <gtest/gtest.h>

#include "platform/series/time_series_object.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

TEST(BandFile, IsATimeSeriesThatOurOwnReaderTakes) {
  const TemporaryFolder folder;
  const double nan = std::numeric_limits<double>::quiet_NaN();
  const ObservedSeries observed{0, {2001, 2, 28, 23, 50, 0}, {0.0, 1.0 / 144.0, 1.5}, {0.1F, -2.0, 3.0}};
  const SeriesBand band{{1.0, nan, 3.0}, {4.0, nan, 6.5}, {7.0, nan, 1e-12}, 2, 0.5};
  const std::string path = (folder / "x_Band_1.csv");
  for (const char* title : {"Low\nwater", "Low\nflow", "Low\nflow"}) writeBandFile(path, title, observed, band);
  EXPECT_FALSE(folder.exists("x_Band_1.2.csv")) << "the same file again";
  EXPECT_TRUE(folder.exists("x_Band_1.1.csv"));
  std::string reason;
  const auto series = createTimeSeriesObject(path, reason);
  ASSERT_TRUE(series && series->open(path)) << reason << series->lastError();
  ASSERT_EQ(series->timeStepCount(), 3);
  ASSERT_EQ(series->itemCount(), 4);
  EXPECT_EQ(series->itemName(2), "5 %");
  EXPECT_NEAR(series->times()[1], 10.0 / 1440.0, 1e-9);
  ASSERT_TRUE(series->getData(1) && series->getData(3) && series->getData(4));
  EXPECT_EQ(series->values(1)[0], 0.1F);
  EXPECT_TRUE(isMissing(series->values(3)[1], series->deleteValue()));
  EXPECT_EQ(series->values(4)[2], 1e-12F);
}

}  // namespace
}  // namespace mirevo
