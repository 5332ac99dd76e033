/// large_report FILE [MEASURES [YEARS]]: writes the report of a search with 50 output measures, each of 20 years of
/// hourly values, for measure.mjs. The values are a made-up river's: seasons, floods and their recession, and gaps in
/// the observations.

#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <limits>
#include <random>
#include <string>

#include <fmt/format.h>

#include "common/calendar.h"
#include "report/page/page_template.h"
#include "report/report_file.h"

namespace {

using namespace mirevo;

constexpr int kEvaluations = 2000;
constexpr int kParameters = 12;
constexpr std::int64_t kHour = 3600;
constexpr int kHoursPerYear = 8766;
constexpr float kNaN = std::numeric_limits<float>::quiet_NaN();

ShownSeries madeUp(int measure, int hours, std::mt19937& random) {
  std::uniform_real_distribution<float> share(0.0F, 1.0F);
  ShownSeries series;
  series.measure = fmt::format("gauge {}", measure + 1);
  const std::int64_t start = secondNumber({2001, 1, 1});
  float flow = 10.0F;
  int gap = 0;
  for (int hour = 0; hour < hours; ++hour) {
    const float season = 1.0F + 0.6F * static_cast<float>(std::sin(2.0 * 3.14159265 * hour / kHoursPerYear));
    flow = 5.0F * season + (flow - 5.0F * season) * 0.995F;
    if (share(random) < 0.002F) flow += 60.0F * share(random) * share(random);
    if (gap == 0 && share(random) < 0.0001F) gap = 300;
    if (gap > 0) --gap;
    series.seconds.push_back(start + hour * kHour);
    series.observed.push_back(gap > 0 ? kNaN : flow * (1.0F + 0.02F * share(random)));
    series.initial.push_back(0.8F * flow + 1.0F);
    series.best.push_back(flow * (1.0F + 0.05F * (share(random) - 0.5F)));
  }
  return series;
}

ReportData largeReport(int measures, int years) {
  std::mt19937 random(1);
  std::uniform_real_distribution<double> share(0.0, 1.0);
  ReportData data;
  data.program = "Mirevo";
  data.run.title = fmt::format("{} measures of {} years of hourly values", measures, years);
  data.run.setupFile = "large.kdx";
  data.run.setupName = "large";
  data.run.task = "optimisation";
  data.run.taskName = "Optimisation";
  data.run.algorithm = "SCE";
  data.run.populationSize = 50;
  data.run.planned = kEvaluations;
  data.periodFirst = secondNumber({2001, 1, 1});
  data.periodLast = data.periodFirst + static_cast<std::int64_t>(years) * kHoursPerYear * kHour;
  for (int i = 0; i < kParameters; ++i) {
    ReportedParameter parameter;
    parameter.name = fmt::format("parameter {}", i + 1);
    parameter.kind = "variable";
    parameter.transformation = "none";
    parameter.upper = 1.0;
    parameter.best = 0.5;
    data.parameters.push_back(parameter);
  }
  for (int i = 0; i < measures; ++i) {
    data.series.series.push_back(madeUp(i, years * kHoursPerYear, random));
    data.measures.push_back({data.series.series.back().measure, "NSE", 1.0, "", true, 0.2, 0.8});
  }
  data.objectives.push_back({"all", 0.8, 0.2});
  data.best = data.series.best = ShownEvaluation{kEvaluations, 0.2};
  data.series.initial = ShownEvaluation{1, 0.8};
  data.initialNumber = 1;
  data.isOfInitialParameters = true;
  ReportedEvaluations& evaluations = data.evaluations;
  evaluations.parameters.resize(kParameters);
  evaluations.measures.resize(measures);
  evaluations.objectives.resize(1);
  for (int i = 0; i < kEvaluations; ++i) {
    evaluations.numbers.push_back(i + 1);
    evaluations.ok.push_back(true);
    evaluations.aggregate.push_back(0.2 + share(random) * (kEvaluations - i) / kEvaluations);
    for (auto* columns : {&evaluations.parameters, &evaluations.measures, &evaluations.objectives}) {
      for (auto& column : *columns) column.push_back(share(random));
    }
  }
  return data;
}

}  // namespace

int main(int argc, char** argv) {
  if (argc < 2) {
    std::fputs("large_report FILE [MEASURES [YEARS]]\n", stderr);
    return 2;
  }
  const int measures = argc > 2 ? std::atoi(argv[2]) : 50;
  const int years = argc > 3 ? std::atoi(argv[3]) : 20;
  std::ofstream(argv[1]) << mirevo::reportPage(mirevo::reportPageTemplate(), largeReport(measures, years));
  return 0;
}
