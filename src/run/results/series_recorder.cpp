#include "run/results/series_recorder.h"

#include <algorithm>
#include <cmath>
#include <exception>
#include <utility>

#include <fmt/core.h>

#include "common/files.h"
#include "common/run_files.h"

namespace mirevo {
namespace {

/// The pause between two writes is a hundred times the duration of the last, and at least this long.
constexpr double kLeastSecondsBetween = 5.0;
constexpr double kShareOfWriting = 0.01;
/// For evaluations whose aggregate is not known yet: 48 megabytes.
constexpr std::size_t kMostUnsettledSteps = 4'000'000;
/// Of a row without the name of its measure: a time and three numbers.
constexpr std::size_t kUsualRowBytes = 48;

std::size_t stepCount(const std::vector<PeriodSeries>& series) {
  std::size_t count = 0;
  for (const PeriodSeries& one : series) count += one.seconds.size();
  return count;
}

constexpr std::string_view kAreThere = ", are there ";
constexpr std::string_view kNoOthers = ": the earlier run left no others";

std::string beginOfLack(std::string_view which, int number) {
  return fmt::format("The series of the {} evaluation, No. {}{}", which, number, kAreThere);
}

/// The inverse: where alone the series of the file are, as its head says.
std::string lackOf(std::string_view which, int number, const SeriesTable& table) {
  const std::string begin = beginOfLack(which, number);
  for (const std::string& line : table.headLines) {
    if (!line.starts_with(begin) || !line.ends_with(kNoOthers)) continue;
    return line.substr(begin.size(), line.size() - kNoOthers.size() - begin.size());
  }
  return {};
}

bool isSame(std::span<const double> a, std::span<const double> b) {
  return std::equal(a.begin(), a.end(), b.begin(), b.end());
}

}  // namespace

SeriesRecorder::SeriesRecorder(std::string path, RecordedSeries run, std::function<double()> clock,
                               std::function<void(std::string_view)> warn)
    : path_(std::move(path)),
      run_(std::move(run)),
      clock_(std::move(clock)),
      warn_(std::move(warn)),
      initialChoice_(run_.initialValues) {}

void SeriesRecorder::resume(const SeriesTable& table) {
  const auto takeOver = [&](std::string_view which, const std::optional<ShownEvaluation>& evaluation,
                            std::vector<float> ShownSeries::*column) {
    std::optional<Held> held;
    if (!evaluation) return held;
    held = Held{};
    held->evaluation = *evaluation;
    held->lack = lackOf(which, evaluation->number, table);
    bool isThere = false;
    for (const std::string& measure : run_.measures) {
      PeriodSeries& series = held->series.emplace_back();
      const auto found = std::find_if(table.series.begin(), table.series.end(),
                                      [&measure](const ShownSeries& shown) { return shown.measure == measure; });
      if (found != table.series.end()) series = {found->seconds, (*found).*column};
      isThere =
          isThere || std::any_of(series.values.begin(), series.values.end(), [](float v) { return !std::isnan(v); });
    }
    if (!isThere) held.reset();  // the file says so, and they may come again
    return held;
  };
  initial_ = takeOver("initial", table.initial, &ShownSeries::initial);
  if (initial_) initialChoice_.resume(initial_->evaluation.number, table.isOfInitialParameters);
  best_ = takeOver("best", table.best, &ShownSeries::best);
  earlierBest_ = best_;
  isChanged_ = initial_.has_value();
}

void SeriesRecorder::evaluationFinished(const EvaluationResult& result, std::span<const double> values,
                                        const std::optional<BestEvaluation>& best) {
  if (!result.shownSeries.empty()) {
    holdInitial(result, values);
    if (std::isnan(result.aggregate)) {
      holdUnsettled({{result.number, result.aggregate}, {values.begin(), values.end()}, result.shownSeries});
    } else if (best && (best->number == result.number || isSame(best->parameterValues, values))) {
      // The final model run of the best set repeats the best evaluation.
      const Held finished{{best->number, best->aggregate}, {values.begin(), values.end()}, result.shownSeries};
      follow(best, &finished);
    }
  }
  if (isChanged_ && clock_() >= nextWrite_) write();
}

void SeriesRecorder::holdInitial(const EvaluationResult& result, std::span<const double> values) {
  if (!initialChoice_.consider(result.number, values)) return;
  initial_ = Held{{result.number, result.aggregate}, {}, result.shownSeries};
  isChanged_ = true;
}

void SeriesRecorder::evaluationPassed(const EvaluationResult& result, std::span<const double> values,
                                      const std::optional<BestEvaluation>& best) {
  isContinued_ = true;
  if (initialChoice_.consider(result.number, values)) {
    initial_ = heldOfKept(result, values);
    isChanged_ = true;
  }
  if (std::isnan(result.aggregate)) {
    if (auto held = heldOfKept(result, values)) holdUnsettled(*std::move(held));
  } else if (best && best->number == result.number && (!best_ || best_->evaluation.number != best->number)) {
    const bool isThere = earlierBest_ && earlierBest_->evaluation.number == result.number;
    if (const auto held = isThere ? earlierBest_ : heldOfKept(result, values)) follow(best, &*held);
  }
}

std::optional<SeriesRecorder::Held> SeriesRecorder::heldOfKept(const EvaluationResult& result,
                                                               std::span<const double> values) const {
  if (run_.kept.empty() || result.simulatedValues.empty()) return std::nullopt;
  Held held{{result.number, result.aggregate}, {values.begin(), values.end()}, {}};
  if (!run_.keepsAllPeriods) {
    held.lack = run_.keepsSteps ? kInEvaluationPeriodAlone
                                : fmt::format("at the times of the observations {}", kInEvaluationPeriodAlone);
  } else if (!run_.keepsSteps) {
    held.lack = "at the times of the observations alone";
  }
  for (const KeptSeries& kept : run_.kept) {
    PeriodSeries& series = held.series.emplace_back();
    for (std::size_t i = 0; i < kept.seconds.size(); ++i) {
      // The part of a validation period that was kept by chance would be taken for the whole.
      const bool isOut = kept.seconds[i] < run_.evaluationFirst || kept.seconds[i] > run_.evaluationLast;
      if (!run_.keepsAllPeriods && isOut) continue;
      const std::size_t index = kept.first + i;
      const double value = index < result.simulatedValues.size() ? result.simulatedValues[index] : std::nan("");
      series.seconds.push_back(kept.seconds[i]);
      series.values.push_back(static_cast<float>(value));
    }
  }
  return held;
}

void SeriesRecorder::holdUnsettled(Held held) {
  const std::size_t steps = stepCount(held.series);
  if (unsettledSteps_ + steps > kMostUnsettledSteps) return;
  unsettledSteps_ += steps;
  const int number = held.evaluation.number;
  unsettled_[number] = std::move(held);
}

/// Keeps the series of the run's best evaluation: the one that has just finished, or one whose aggregate was not known
/// when it finished.
void SeriesRecorder::follow(const std::optional<BestEvaluation>& best, const Held* finished) {
  const bool isThere = best && best_ && best_->evaluation.number == best->number && !best_->series.empty();
  if (!best || (isThere && (finished == nullptr || best_->lack.empty()))) return;
  const auto waiting = unsettled_.find(best->number);
  if (finished != nullptr) {
    best_ = *finished;
  } else if (waiting != unsettled_.end()) {
    best_ = waiting->second;
  } else if (best_ && isSame(best_->values, best->parameterValues)) {
    best_->evaluation.number = best->number;  // of two equal evaluations the search took the other
  } else {
    return;
  }
  best_->evaluation.aggregate = best->aggregate;
  isChanged_ = true;
}

void SeriesRecorder::aggregateSettled(int number, double aggregate) {
  if (!initial_ || initial_->evaluation.number != number) return;
  initial_->evaluation.aggregate = aggregate;
  isChanged_ = true;
}

void SeriesRecorder::finish(const std::optional<BestEvaluation>& best) {
  try {
    follow(best, nullptr);
    if (best && (!best_ || best_->evaluation.number != best->number)) {
      best_ = Held{{best->number, best->aggregate}, best->parameterValues, {}};
      isChanged_ = true;
    }
    if (!hasEnded_) warnOfMissing();
    hasEnded_ = true;
    if (isChanged_) write();
  } catch (const std::exception& error) {  // out of memory: the end of the run must not fail
    warn(error.what());
  }
}

std::string SeriesRecorder::missing(std::string_view which, int number) const {
  return fmt::format("The series of the {} evaluation, No. {}, are not in {}: {}", which, number, fileNameOf(path_),
                     isContinued_ ? "the earlier run left none of them" : "they were not kept");
}

/// What a reader of the file cannot see in it.
std::vector<std::string> SeriesRecorder::notes() const {
  std::vector<std::string> lines;
  const auto add = [&](std::string_view which, int number, const std::optional<Held>& held) {
    if (!held || held->series.empty()) {
      if (hasEnded_) lines.push_back(missing(which, number));  // before, they may still come
    } else if (!held->lack.empty()) {
      lines.push_back(beginOfLack(which, number) + held->lack + std::string(kNoOthers));
    }
  };
  if (const auto& number = initialChoice_.number()) add("initial", *number, initial_);
  if (best_) add("best", best_->evaluation.number, best_);
  return lines;
}

void SeriesRecorder::warnOfMissing() {
  if (const auto& number = initialChoice_.number(); number && !initial_) warn_(missing("initial", *number));
  if (best_ && best_->series.empty()) warn_(missing("best", best_->evaluation.number));
}

void SeriesRecorder::warn(std::string_view reason) {
  if (std::exchange(hasWarned_, true)) return;
  warn_(fmt::format("The series of the best evaluation cannot be written to {}: {}", path_, reason));
}

void SeriesRecorder::write() {
  const double begun = clock_();
  SeriesTable table;
  table.headLines = run_.headLines;
  const std::vector<std::string> lines = notes();
  table.headLines.insert(table.headLines.end(), lines.begin(), lines.end());
  table.task = run_.task;
  if (initial_) table.initial = initial_->evaluation;
  table.isOfInitialParameters = initialChoice_.hasSetupValues();
  if (best_) table.best = best_->evaluation;
  // One series after another: all of them may take more memory than their text.
  std::size_t rowCount = 0;
  std::size_t bytes = 0;
  for (std::size_t i = 0; i < run_.measures.size(); ++i) {
    const std::size_t rows = secondsOf(i).size();
    rowCount += rows;
    bytes += rows * (run_.measures[i].size() + kUsualRowBytes);
  }
  std::string text = seriesTableHead(table, rowCount);
  text.reserve(text.size() + bytes);
  for (std::size_t i = 0; i < run_.measures.size(); ++i) appendSeriesRows(text, shownSeries(i));
  std::string reason;
  if (!replaceFile(path_, text, reason)) warn(reason);
  isChanged_ = false;
  const double ended = clock_();
  nextWrite_ = ended + std::max(kLeastSecondsBetween, (ended - begun) / kShareOfWriting);
}

const PeriodSeries& SeriesRecorder::seriesOf(const std::optional<Held>& held, std::size_t pair) {
  static const PeriodSeries kNone;
  return held && !held->series.empty() ? held->series[pair] : kNone;
}

std::vector<std::int64_t> SeriesRecorder::secondsOf(std::size_t pair) const {
  std::vector<std::int64_t> seconds;
  for (const PeriodSeries* series : {&run_.observations[pair], &seriesOf(initial_, pair), &seriesOf(best_, pair)}) {
    for (const std::int64_t second : series->seconds) {
      if (second >= run_.periodFirst && second <= run_.periodLast) seconds.push_back(second);
    }
  }
  std::sort(seconds.begin(), seconds.end());
  seconds.erase(std::unique(seconds.begin(), seconds.end()), seconds.end());
  return seconds;
}

/// The series of the pair at all their times in the period.
ShownSeries SeriesRecorder::shownSeries(std::size_t pair) const {
  const PeriodSeries& observed = run_.observations[pair];
  ShownSeries shown;
  shown.measure = run_.measures[pair];
  shown.seconds = secondsOf(pair);
  shown.observed.assign(shown.seconds.size(), std::nanf(""));
  for (std::size_t i = 0, k = 0; k < observed.seconds.size(); ++k) {  // observations are not interpolated
    while (i < shown.seconds.size() && shown.seconds[i] < observed.seconds[k]) ++i;
    if (i < shown.seconds.size() && shown.seconds[i] == observed.seconds[k]) shown.observed[i] = observed.values[k];
  }
  shown.initial = valuesAt(seriesOf(initial_, pair), shown.seconds, run_.largestGap);
  shown.best = valuesAt(seriesOf(best_, pair), shown.seconds, run_.largestGap);
  return shown;
}

}  // namespace mirevo
