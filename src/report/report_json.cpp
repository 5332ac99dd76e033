#include "report/report_json.h"

#include <algorithm>
#include <cmath>

#include <fmt/core.h>

#include "algorithms/numbers/sample_summary.h"
#include "common/calendar.h"
#include "measures/fit_figures.h"
#include "report/drawn_lines.h"
#include "report/hydrograph_views.h"
#include "report/json_writer.h"
#include "report/report_front.h"
#include "report/report_repetitions.h"
#include "report/report_sample.h"
#include "report/report_series.h"
#include "report/report_validation.h"
#include "report/thinning.h"

namespace mirevo {
namespace {

using Digits = JsonWriter::Digits;

constexpr int kFormat = 1;

void writeRun(JsonWriter& json, const ReportData& data) {
  const ReportedRun& run = data.run;
  json.key("run").beginObject();
  json.member("title", run.title).member("setup", run.setupFile).member("setupName", run.setupName);
  json.member("task", run.task).member("taskName", run.taskName);
  json.optionalMember("started", run.started).optionalMember("ended", run.ended).member("reportMade", run.reportMade);
  json.member("state", runStageKey(run.stage)).optionalMember("message", run.message);
  json.member("evaluations", data.evaluations.numbers.size());
  json.key("planned");
  if (run.planned > 0) {
    json.integer(run.planned);
  } else {
    json.null();
  }
  json.member("failed", std::count(data.evaluations.ok.begin(), data.evaluations.ok.end(), false));
  if (run.repeats > 0) json.member("repeats", run.repeats);
  json.member("aggregation", run.aggregation).optionalMember("algorithm", run.algorithm);
  json.optionalMember("surrogate", run.surrogate).key("populationSize");
  if (run.populationSize > 0) {
    json.integer(run.populationSize);
  } else {
    json.null();
  }
  json.key("period").beginArray().text(run.periodStart).text(run.periodEnd).endArray();
  json.key("seed");
  if (run.seed) {
    json.integer(*run.seed);
  } else {
    json.null();
  }
  const auto isNamed = [](const std::string& name) { return !name.empty(); };
  if (std::any_of(data.runNames.begin(), data.runNames.end(), isNamed)) json.member("runNames", data.runNames);
  json.member("closingWarnings", run.closingWarnings).member("notes", run.notes).endObject();
}

void writeParameters(JsonWriter& json, const ReportData& data) {
  json.key("parameters").beginArray();
  for (const ReportedParameter& parameter : data.parameters) {
    json.beginObject().member("name", parameter.name).member("kind", parameter.kind);
    json.optionalMember("comment", parameter.comment).optionalMember("equation", parameter.equation);
    json.member("transformation", parameter.transformation).member("integer", parameter.isInteger);
    json.member("lower", parameter.lower).member("upper", parameter.upper);
    json.member("start", parameter.start).member("best", parameter.best);
    json.optionalMember("nearBound", parameter.nearBound).endObject();
  }
  json.endArray();
}

void writeMeasures(JsonWriter& json, const ReportData& data) {
  json.key("measures").beginArray();
  for (const ReportedMeasure& measure : data.measures) {
    json.beginObject().member("name", measure.name).member("statistic", measure.statistic);
    json.member("weight", measure.weight).optionalMember("objective", measure.objective);
    if (measure.isCriterion) json.member("isCriterion", true);
    json.member("initial", measure.initial).member("best", measure.best).endObject();
  }
  json.endArray().key("objectives").beginArray();
  for (const ReportedObjective& objective : data.objectives) {
    json.beginObject().member("name", objective.name);
    json.member("initial", objective.initial).member("best", objective.best).endObject();
  }
  json.endArray().key("best");
  if (data.best) {
    json.beginObject().member("number", data.best->number).member("aggregate", data.best->aggregate).endObject();
  } else {
    json.null();
  }
}

void writeFailures(JsonWriter& json, const ReportData& data) {
  json.key("failures").beginArray();
  for (const FailureReason& failure : data.failures) {
    json.beginObject().member("reason", failure.reason).member("count", failure.count);
    json.member("example", failure.example).endObject();
  }
  json.endArray();
}

void writeEvaluations(JsonWriter& json, const ReportedEvaluations& evaluations) {
  json.key("evaluations").beginObject().member("count", evaluations.numbers.size());
  json.key("numbers").beginArray();
  for (const int number : evaluations.numbers) json.integer(number);
  json.endArray().key("ok").beginArray();
  for (const bool ok : evaluations.ok) json.integer(ok ? 1 : 0);
  json.endArray();
  json.key("aggregate").numbers(evaluations.aggregate, Digits::drawn);
  json.key("parameters").rows(evaluations.parameters, Digits::drawn);
  json.key("objectives").rows(evaluations.objectives, Digits::drawn);
  json.key("measures").rows(evaluations.measures, Digits::drawn).endObject();
}

void writeFigures(JsonWriter& json, std::string_view name, const FitFigures& figures) {
  if (figures.count == 0) return;
  json.key(name).beginObject().member("n", figures.count).member("nse", figures.nse).member("kge", figures.kge);
  json.member("kgeR", figures.correlation).member("kgeAlpha", figures.variability);
  json.member("kgeBeta", figures.meanRatio).member("pbias", figures.percentBias);
  json.member("rmse", figures.rmse).member("r2", figures.rSquared).endObject();
}

void writeFlowDuration(JsonWriter& json, const ShownSeries& series) {
  json.key("flowDuration").beginObject();
  json.key("exceedance").numbers(exceedancePercentages(), Digits::drawn);
  json.key("observed").numbers(flowDuration(series.observed), Digits::drawn);
  json.key("initial").numbers(flowDuration(series.initial), Digits::drawn);
  json.key("best").numbers(flowDuration(series.best), Digits::drawn).endObject();
}

void writeAbove(JsonWriter& json, const SeriesAbove& above) {
  json.key("above").beginObject().member("name", above.name);
  writeTimes(json, above.series.seconds);
  json.key("values").numbers(above.series.values, Digits::drawn).member("thinned", above.isThinned).endObject();
}

void writeDrawnLines(JsonWriter& json, const ShownSeries& series) {
  const DrawnLines lines = drawnLines(series);
  json.member("observedAsPoints", lines.observed.isPoints);
  json.key("breaks").beginObject();
  writeBreaks(json, "observed", lines.observed);
  writeBreaks(json, "initial", lines.initial);
  writeBreaks(json, "best", lines.best);
  json.endObject();
}

/// The series of each scenario beside those of a measure.
void writeScenarios(JsonWriter& json, const ReportData& data, const std::string& measure) {
  json.key("scenarios").beginArray();
  for (const ScenarioSeries& one : data.scenarioSeries) {
    if (one.measure != measure) continue;
    json.beginObject();
    writeSimulated(json, one, data.scenarioSeries.size());
    json.endObject();
  }
  json.endArray();
}

void writePeriod(JsonWriter& json, const ReportedPeriod& period) {
  json.member("name", period.name).member("start", period.start).member("end", period.end);
  json.member("kind", period.isValidation ? "validation" : "calibration");
}

/// The periods with the figures of the best evaluation in each; `whole` reaches over all of them.
void writePeriodsOf(JsonWriter& json, const ReportData& data, const ShownSeries& series, const ShownSeries& whole) {
  json.key("periods").beginArray();
  for (const ReportedPeriod& period : data.periods) {
    writePeriod(json.beginObject(), period);
    json.key("first").integer(epochMilliseconds(period.first)).key("last").integer(epochMilliseconds(period.last));
    const ShownSeries part = period.isValidation ? partOf(whole, period.first, period.last) : series;
    const bool isThere = data.series.best && !(period.isValidation && data.bestLacksValidation);
    if (isThere) writeFigures(json, "best", fitFigures(part.best, part.observed));
    json.endObject();
  }
  json.endArray();
}

void writeValidation(JsonWriter& json, const ReportData& data) {
  const ValidationTable& table = data.validation;
  if (table.measures.empty()) return;
  json.key("validation").beginObject().member("best", table.bestNumber).member("tenth", table.tenth);
  json.member("count", table.count).key("periods").beginArray();
  for (const ReportedPeriod& period : data.periods) {
    writePeriod(json.beginObject(), period);
    json.endObject();
  }
  json.endArray().key("measures").beginArray();
  for (std::size_t i = 0; i < table.measures.size(); ++i) {
    json.beginObject().member("name", table.names[i]);
    json.member("statistic", data.measures[table.measures[i]].statistic).key("values").beginArray();
    for (const ValidationRange& range : table.values[i]) {
      json.beginObject().member("best", range.best).member("least", range.least);
      json.member("median", range.median).member("largest", range.largest).endObject();
    }
    json.endArray().endObject();
  }
  json.endArray().endObject();
}

void writeSeries(JsonWriter& json, const ReportData& data) {
  json.key("series").beginArray();
  for (std::size_t place = 0; place < data.series.series.size(); ++place) {
    const ShownSeries& series = data.series.series[place];
    const ShownSeries& whole = place < data.wholeSeries.size() ? data.wholeSeries[place] : series;
    json.beginObject().member("measure", series.measure);
    if (place < data.seriesLabels.size()) {
      json.optionalMember("quantity", data.seriesLabels[place].quantity);
      json.optionalMember("unit", data.seriesLabels[place].unit);
    }
    const std::size_t most = mostDrawnTimes(data.series.series.size());
    const bool isThinned = whole.seconds.size() > most;
    const ShownSeries& drawn = isThinned ? thinned(whole, most) : whole;
    writeTimes(json, drawn.seconds);
    json.key("observed").numbers(drawn.observed, Digits::drawn);
    if (data.series.initial) json.key("initial").numbers(drawn.initial, Digits::drawn);
    if (data.series.best) {
      json.key("best").numbers(drawn.best, Digits::drawn).member("bestNumber", data.series.best->number);
    }
    json.key("period").beginArray().integer(epochMilliseconds(data.periodFirst));
    json.integer(epochMilliseconds(data.periodLast)).endArray();
    if (!data.periods.empty()) writePeriodsOf(json, data, series, whole);
    json.key("figures").beginObject();
    if (data.series.initial) writeFigures(json, "initial", fitFigures(series.initial, series.observed));
    if (data.series.best) writeFigures(json, "best", fitFigures(series.best, series.observed));
    json.endObject().member("thinned", isThinned);
    if (isThinned) writeFlowDuration(json, series);
    writeDrawnLines(json, whole);
    writeScenarios(json, data, series.measure);
    if (place < data.above.size() && data.above[place]) writeAbove(json, *data.above[place]);
    const bool hasHoles = place < data.seriesLabels.size() && data.seriesLabels[place].hasHoles;
    writeHydrographViews(json, series, dateOfSecond(data.periodFirst)[date_field::kMonth], !hasHoles);
    json.endObject();
  }
  json.endArray();
}

void writeValues(JsonWriter& json, std::string_view name, const ValueSummary& values) {
  json.key(name).beginArray().number(values.least).number(values.mean).number(values.largest).endArray();
}

void writeComparisons(JsonWriter& json, const ReportData& data) {
  json.key("comparisons").beginArray();
  for (const ReportedComparison& comparison : data.comparisons) {
    const MeasurePairs& pairs = comparison.pairs;
    json.beginObject().member("measure", comparison.measure).member("evaluation", comparison.number);
    json.member("simulatedItem", comparison.items.simulated).member("observedItem", comparison.items.observed);
    json.optionalMember("counted", comparison.counted);
    json.member("pairs", pairs.count).member("missing", pairs.missingCount);
    json.key("span").beginArray().integer(epochMilliseconds(pairs.first)).integer(epochMilliseconds(pairs.last));
    json.endArray();
    writeValues(json, "observed", pairs.observed);
    writeValues(json, "simulated", pairs.simulated);
    if (comparison.simulatedFirst) writeValues(json, "simulatedFirst", *comparison.simulatedFirst);
    json.endObject();
  }
  json.endArray();
}

void writeGaps(JsonWriter& json, std::string_view name, const TimedValues& drawn, const TimedValues& whole) {
  json.key(name).beginArray();
  for (const std::size_t i : gapsOf(drawn, whole)) json.integer(static_cast<std::int64_t>(i));
  json.endArray();
}

void writeBands(JsonWriter& json, const ReportData& data) {
  json.key("band").beginArray();
  for (const ReportedBand& whole : data.bands) {
    const std::size_t most = mostDrawnTimes(data.bands.size());
    const bool isThinned = whole.seconds.size() > most;
    const ReportedBand& band = isThinned ? thinned(whole, most) : whole;
    json.beginObject().member("measure", band.measure).optionalMember("quantity", band.label.quantity);
    json.optionalMember("unit", band.label.unit);
    if (band.isTotal) json.member("isTotal", true);
    writeTimes(json, band.seconds);
    json.key("observed").numbers(band.observed, Digits::drawn).key("p5").numbers(band.lower, Digits::drawn);
    json.key("p50").numbers(band.median, Digits::drawn).key("p95").numbers(band.upper, Digits::drawn);
    json.member("inside", static_cast<double>(band.insideCount) / static_cast<double>(band.observationCount));
    json.member("n", band.observationCount).member("width", band.meanWidth);
    json.member("relativeWidth", band.relativeWidth);
    writeGaps(json, "gaps", {band.seconds, band.median}, {whole.seconds, whole.median});
    writeGaps(json, "observedGaps", {band.seconds, band.observed}, {whole.seconds, whole.observed});
    if (!band.runs.empty()) json.key("runs").numbers(band.runs, Digits::drawn);
    json.member("fewestRuns", band.fewestRuns).member("mostRuns", band.mostRuns).member("thinned", isThinned);
    json.endObject();
  }
  json.endArray();
}

void writeCovariance(JsonWriter& json, const ReportedCovariance& covariance) {
  json.beginObject().member("names", covariance.names);
  json.key("estimate").numbers(covariance.estimate, Digits::table);
  json.key("standardDeviation").numbers(covariance.standardDeviation, Digits::table);
  json.key("lower95").numbers(covariance.lower95, Digits::table);
  json.key("upper95").numbers(covariance.upper95, Digits::table);
  const bool isShown = covariance.names.size() <= kMostShownParameters;
  json.key("correlation").rows(isShown ? covariance.correlation : std::vector<std::vector<double>>{}, Digits::drawn);
  if (!isShown) {
    json.key("largestCorrelations").beginArray();
    for (const auto& [i, j] : largestEntries(covariance.correlation)) {
      json.beginObject().member("first", covariance.names[i]).member("second", covariance.names[j]);
      json.member("value", covariance.correlation[i][j]).endObject();
    }
    json.endArray().member("correlationFile", covariance.correlationFile);
  }
  json.optionalMember("lagText", covariance.lagText).key("leftOut").beginArray();
  for (const auto& [name, reason] : covariance.leftOut) {
    json.beginObject().member("name", name).member("reason", reason).endObject();
  }
  json.endArray().endObject();
}

void writeSensitivity(JsonWriter& json, const ReportedSensitivity& sensitivity) {
  json.key("sensitivity").beginObject().member("parameters", sensitivity.parameters);
  json.member("outputs", sensitivity.outputs);
  json.key("derivatives").rows(sensitivity.derivatives, Digits::drawn);
  json.key("dimensionless").rows(sensitivity.dimensionless, Digits::drawn);
  const auto isKnown = [](const std::vector<std::string>& row) {
    return std::ranges::any_of(row, [](const std::string& problem) { return !problem.empty(); });
  };
  if (std::ranges::any_of(sensitivity.problems, isKnown)) {
    json.key("problems").beginArray();
    for (const std::vector<std::string>& row : sensitivity.problems) {
      json.beginArray();
      for (const std::string& problem : row) json.text(problem);
      json.endArray();
    }
    json.endArray();
  }
  json.key("composite").numbers(sensitivity.composite, Digits::drawn).member("ranking", sensitivity.ranking);
  json.member("isOfObservations", sensitivity.isOfObservations).member("hasBetterFit", sensitivity.hasBetterFit);
  json.key("covariance");
  if (sensitivity.covariance) {
    writeCovariance(json, *sensitivity.covariance);
  } else {
    json.null();
  }
  json.endObject();
}

}  // namespace

std::string reportJson(const ReportData& data) {
  JsonWriter json;
  json.beginObject().member("format", kFormat).member("program", data.program);
  writeRun(json, data);
  writeParameters(json, data);
  writeMeasures(json, data);
  writeComparisons(json, data);
  json.key("initialNumber");
  if (data.initialNumber) {
    json.integer(*data.initialNumber);
    json.member("initialLabel", data.isOfInitialParameters ? "initial parameters" : "first evaluation");
  } else {
    json.null();
  }
  writeFailures(json, data);
  writeEvaluations(json, data.evaluations);
  writeSeries(json, data);
  writeValidation(json, data);
  writeBands(json, data);
  if (data.sensitivity) writeSensitivity(json, *data.sensitivity);
  if (data.estimate) writeCovariance(json.key("estimate"), *data.estimate);
  if (data.front) writeFront(json, *data.front);
  if (data.repetitions) writeRepetitions(json, *data.repetitions);
  if (!data.morris.empty()) writeMorris(json, data.morris);
  if (data.sobol) writeSobol(json, *data.sobol);
  if (data.glue) writeGlue(json, *data.glue);
  if (data.posterior) writePosterior(json, *data.posterior);
  writeSample(json, data);
  json.member("summary", data.summary).endObject();
  return json.take();
}

}  // namespace mirevo
