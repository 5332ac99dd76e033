#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <iterator>
#include <optional>
#include <span>
#include <vector>

#include "run/results/result_row.h"

namespace mirevo {

/// Rows of one result file in a few large blocks: a million of them take little more room than their numbers.
class ResultRows final {
 public:
  ResultRows() = default;
  /// Not explicit: whoever has a few rows passes them as they are.
  // NOLINTNEXTLINE(google-explicit-constructor)
  ResultRows(std::span<const ResultRow> rows);
  // NOLINTNEXTLINE(google-explicit-constructor)
  ResultRows(const std::vector<ResultRow>& rows) : ResultRows(std::span(rows)) {}

  /// Room for so many rows like the first one.
  void reserve(std::size_t count) { reserved_ = count; }
  /// All rows have as many values of each kind.
  void add(const ResultRow& row);

  std::size_t size() const { return marks_.size(); }
  bool empty() const { return marks_.empty(); }
  int number(std::size_t i) const { return marks_[i].number; }
  bool isOk(std::size_t i) const { return marks_[i].ok; }
  /// ResultRow::repeats.
  std::optional<int> repeats(std::size_t i) const;
  /// Fills `row`, whose memory is used again.
  void read(std::size_t i, ResultRow& row) const;
  ResultRow operator[](std::size_t i) const;
  /// Whether there is a row with this number; the rows are in order.
  bool has(int number) const { return find(number) < size(); }
  /// The index of the row with this number, size() if there is none; the rows are in order.
  std::size_t find(int number) const;

  /// Sorts the rows by number; of several with the same number the first is kept.
  void putInOrder();
  /// Keeps those rows of which the condition is true; it gets their indices in rising order.
  void keepIf(const std::function<bool(std::size_t)>& condition);

  /// Reads all rows one after another.
  class Iterator final {
   public:
    using iterator_category = std::input_iterator_tag;
    using value_type = ResultRow;
    using difference_type = std::ptrdiff_t;
    using pointer = const ResultRow*;
    using reference = const ResultRow&;

    Iterator(const ResultRows* rows, std::size_t index) : rows_(rows), index_(index) {}
    const ResultRow& operator*() {
      rows_->read(index_, row_);
      return row_;
    }
    Iterator& operator++() {
      ++index_;
      return *this;
    }
    bool operator==(const Iterator& other) const { return index_ == other.index_; }

   private:
    const ResultRows* rows_;
    std::size_t index_;
    ResultRow row_;
  };
  Iterator begin() const { return {this, 0}; }
  Iterator end() const { return {this, size()}; }

 private:
  struct Mark {
    std::uint64_t lineChecksum;
    std::size_t line;
    int number;
    int repeats;  ///< kNoColumn without the column
    bool ok;
  };
  static constexpr int kNoColumn = -1;
  std::size_t width() const { return parameters_ + measures_ + objectives_ + 1 + validation_; }
  void move(std::size_t from, std::size_t to);
  void cut(std::size_t size);

  std::size_t reserved_ = 0;
  std::size_t parameters_ = 0;  ///< values of a row
  std::size_t measures_ = 0;
  std::size_t objectives_ = 0;
  std::size_t validation_ = 0;
  std::vector<Mark> marks_;     ///< one a row
  std::vector<double> values_;  ///< of one row after another, in the order of the columns
};

}  // namespace mirevo
