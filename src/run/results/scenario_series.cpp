#include "run/results/scenario_series.h"

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <cmath>
#include <cstring>
#include <fstream>
#include <limits>
#include <optional>
#include <utility>

#include <fmt/format.h>

#include "common/calendar.h"
#include "common/files.h"
#include "common/text.h"
#include "common/utf8.h"
#include "run/results/series_table.h"

namespace mirevo {
namespace {

constexpr std::string_view kHeader = "Evaluation\tMeasure\tTime\tSimulated";
constexpr std::string_view kEnd = "# endOfEvaluation\t";

void appendRows(std::string& text, const ScenarioSeries& one) {
  for (std::size_t i = 0; i < one.series.seconds.size(); ++i) {
    const float value = one.series.values[i];
    fmt::format_to(std::back_inserter(text), "{}\t{}\t{}\t", one.number, one.measure, isoTime(one.series.seconds[i]));
    if (std::isfinite(value)) {
      fmt::format_to(std::back_inserter(text), "{}\n", value);
    } else {
      text += "NaN\n";
    }
  }
}

std::optional<float> readValue(std::string_view text) {
  if (text == "NaN") return std::numeric_limits<float>::quiet_NaN();
  float value = 0.0F;
  const auto read = std::from_chars(text.data(), text.data() + text.size(), value);
  if (read.ec != std::errc() || read.ptr != text.data() + text.size()) return std::nullopt;
  return value;
}

void readRow(std::string_view line, std::vector<ScenarioSeries>& block) {
  const std::vector<std::string_view> cells = splitAt(line, '\t');
  if (cells.size() != 4) return;
  const auto number = parseInteger(cells[0]);
  const auto second = readIsoTime(cells[2]);
  const auto value = readValue(cells[3]);
  if (!number || !second || !value) return;
  if (block.empty() || block.back().number != *number || block.back().measure != cells[1]) {
    block.push_back({*number, std::string(cells[1]), {}});
  }
  PeriodSeries& series = block.back().series;
  if (!series.seconds.empty() && *second <= series.seconds.back()) return;
  series.seconds.push_back(*second);
  series.values.push_back(*value);
}

std::string endLine(int number) {
  return fmt::format("{}{}\n", kEnd, number);
}

}  // namespace

std::vector<ScenarioSeries> readScenarioSeries(std::string_view text) {
  std::vector<ScenarioSeries> all;
  std::vector<ScenarioSeries> block;  // an evaluation whose end has not been read
  bool isBelowHeader = false;
  for (std::size_t end = text.find('\n'); end != std::string_view::npos; end = text.find('\n')) {
    const std::string_view line = trimTrailing(text.substr(0, end));
    text.remove_prefix(end + 1);
    if (!isBelowHeader) {
      isBelowHeader = line == kHeader;
    } else if (line.starts_with(kEnd)) {
      std::move(block.begin(), block.end(), std::back_inserter(all));
      block.clear();
    } else {
      readRow(line, block);
    }
  }
  return all;
}

ScenarioSeriesFile::ScenarioSeriesFile(Settings settings, std::function<void(std::string_view)> warn)
    : settings_(std::move(settings)), warn_(std::move(warn)) {}

void ScenarioSeriesFile::begin(bool goesOn) {
  std::string text;
  for (const std::string& line : settings_.headLines) text += fmt::format("# {}\n", withValidUtf8(line));
  text.append(kHeader).append("\n");
  std::string reason;
  const auto earlier = goesOn ? readTextFile(settings_.path, reason) : std::nullopt;
  for (const ScenarioSeries& one : earlier ? readScenarioSeries(*earlier) : std::vector<ScenarioSeries>{}) {
    const bool isNext = written_.empty() || written_.back() != one.number;
    if (isNext && !written_.empty()) text += endLine(written_.back());
    if (isNext) written_.push_back(one.number);
    appendRows(text, one);
  }
  if (!written_.empty()) text += endLine(written_.back());
  if (replaceFile(settings_.path, text, reason)) return;
  hasFailed_ = true;
  warn_(fmt::format("The series of the scenarios cannot be written to {}: {}", settings_.path, reason));
}

void ScenarioSeriesFile::add(int number, const std::vector<PeriodSeries>& series) {
  const bool isWritten = std::find(written_.begin(), written_.end(), number) != written_.end();
  if (hasFailed_ || series.empty() || number > settings_.mostRuns || isWritten) return;
  std::string text;
  for (std::size_t i = 0; i < std::min(series.size(), settings_.measures.size()); ++i) {
    ScenarioSeries one{number, settings_.measures[i], {}};
    for (std::size_t k = 0; k < series[i].seconds.size(); ++k) {
      if (series[i].seconds[k] < settings_.periodFirst || series[i].seconds[k] > settings_.periodLast) continue;
      one.series.seconds.push_back(series[i].seconds[k]);
      one.series.values.push_back(series[i].values[k]);
    }
    appendRows(text, one);
  }
  append(text + endLine(number));
  written_.push_back(number);
}

void ScenarioSeriesFile::append(const std::string& text) {
  errno = 0;
  std::ofstream file(settings_.path, std::ios::binary | std::ios::app);
  file.write(text.data(), static_cast<std::streamsize>(text.size()));
  file.flush();
  if (file) return;
  hasFailed_ = true;
  warn_(fmt::format("The series of the scenarios cannot be written to {}: {}", settings_.path, std::strerror(errno)));
}

}  // namespace mirevo
