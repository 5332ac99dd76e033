// Any text as the recorded series: what was read is written and read back the same, and a run goes on with it.

#include <cstdint>
#include <string_view>

#include "require.h"
#include "run/results/series_recorder.h"
#include "run/results/series_table.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const mirevo::SeriesTable table = mirevo::readSeriesTable({reinterpret_cast<const char*>(data), size});
  for (const mirevo::ShownSeries& series : table.series) {
    const std::size_t rows = series.seconds.size();
    require(series.observed.size() == rows && series.initial.size() == rows && series.best.size() == rows);
  }
  const std::string written = mirevo::seriesTableText(table);
  require(mirevo::seriesTableText(mirevo::readSeriesTable(written)) == written);
  mirevo::RecordedSeries run;
  run.measures = {"flow", "level"};
  run.observations.resize(2);
  run.initialValues = {1.0};
  mirevo::SeriesRecorder recorder(
      "/nowhere/s_Series.dat", run, [] { return 0.0; }, [](std::string_view) {});
  recorder.resume(table);
  recorder.evaluationPassed({.number = 1, .aggregate = 2.0}, std::vector{1.0}, mirevo::BestEvaluation{1, 2.0, {1.0}});
  recorder.finish(mirevo::BestEvaluation{1, 2.0, {1.0}});
  return 0;
}
