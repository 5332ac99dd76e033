#include "run/results/result_rows.h"

#include <algorithm>
#include <cassert>
#include <numeric>
#include <utility>

namespace mirevo {

ResultRows::ResultRows(std::span<const ResultRow> rows) {
  reserve(rows.size());
  for (const ResultRow& row : rows) add(row);
}

void ResultRows::add(const ResultRow& row) {
  if (marks_.empty()) {
    parameters_ = row.parameters.size();
    measures_ = row.measures.size();
    objectives_ = row.objectives.size();
    validation_ = row.validation.size();
    marks_.reserve(reserved_);
    values_.reserve(reserved_ * width());
  }
  marks_.push_back({row.lineChecksum, row.line, row.number, row.repeats.value_or(kNoColumn), row.ok});
  values_.insert(values_.end(), row.parameters.begin(), row.parameters.end());
  values_.insert(values_.end(), row.measures.begin(), row.measures.end());
  values_.insert(values_.end(), row.objectives.begin(), row.objectives.end());
  values_.push_back(row.aggregate);
  values_.insert(values_.end(), row.validation.begin(), row.validation.end());
  assert(values_.size() == marks_.size() * width());
}

void ResultRows::read(std::size_t i, ResultRow& row) const {
  const Mark& mark = marks_[i];
  row.lineChecksum = mark.lineChecksum;
  row.line = mark.line;
  row.number = mark.number;
  row.ok = mark.ok;
  row.repeats = repeats(i);
  const double* from = values_.data() + i * width();
  const auto take = [&from](std::vector<double>& values, std::size_t count) {
    values.assign(from, from + count);
    from += count;
  };
  take(row.parameters, parameters_);
  take(row.measures, measures_);
  take(row.objectives, objectives_);
  row.aggregate = *from++;
  take(row.validation, validation_);
}

std::optional<int> ResultRows::repeats(std::size_t i) const {
  return marks_[i].repeats == kNoColumn ? std::nullopt : std::optional(marks_[i].repeats);
}

ResultRow ResultRows::operator[](std::size_t i) const {
  ResultRow row;
  read(i, row);
  return row;
}

std::size_t ResultRows::find(int number) const {
  if (number < 1) return size();
  // None is missing in most files.
  const std::size_t usual = static_cast<std::size_t>(number) - 1;
  if (usual < size() && marks_[usual].number == number) return usual;
  const auto found = std::lower_bound(marks_.begin(), marks_.end(), number,
                                      [](const Mark& mark, int wanted) { return mark.number < wanted; });
  return found == marks_.end() || found->number != number ? size() : static_cast<std::size_t>(found - marks_.begin());
}

void ResultRows::putInOrder() {
  const auto isBefore = [](const Mark& a, const Mark& b) { return a.number < b.number; };
  if (!std::is_sorted(marks_.begin(), marks_.end(), isBefore)) {
    std::vector<std::size_t> order(size());
    std::iota(order.begin(), order.end(), std::size_t{0});
    std::stable_sort(order.begin(), order.end(),
                     [&](std::size_t a, std::size_t b) { return isBefore(marks_[a], marks_[b]); });
    std::vector<Mark> marks;
    std::vector<double> values;
    marks.reserve(marks_.size());
    values.reserve(values_.size());
    for (const std::size_t i : order) {
      marks.push_back(marks_[i]);
      const auto from = values_.begin() + static_cast<std::ptrdiff_t>(i * width());
      values.insert(values.end(), from, from + static_cast<std::ptrdiff_t>(width()));
    }
    marks_ = std::move(marks);
    values_ = std::move(values);
  }
  int last = 0;
  keepIf([&](std::size_t i) { return i == 0 || marks_[i].number != last ? (last = marks_[i].number, true) : false; });
}

void ResultRows::keepIf(const std::function<bool(std::size_t)>& condition) {
  std::size_t kept = 0;
  for (std::size_t i = 0; i < size(); ++i) {
    if (!condition(i)) continue;
    if (kept < i) move(i, kept);
    ++kept;
  }
  cut(kept);
}

void ResultRows::move(std::size_t from, std::size_t to) {
  marks_[to] = marks_[from];
  const auto begin = values_.begin() + static_cast<std::ptrdiff_t>(from * width());
  std::copy(begin, begin + static_cast<std::ptrdiff_t>(width()),
            values_.begin() + static_cast<std::ptrdiff_t>(to * width()));
}

void ResultRows::cut(std::size_t size) {
  marks_.resize(size);
  values_.resize(size * width());
}

}  // namespace mirevo
