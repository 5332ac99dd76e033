#pragma once

#include <cstdint>
#include <limits>
#include <map>
#include <memory>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include "platform/series/binary_file.h"
#include "platform/series/time_series_object.h"

namespace mirevo {

/// The binary results of a model, which may have very many items: their names are made when they are asked for, and
/// only the items that are read are in memory.
class ResultSeries : public TimeSeriesObject {
 public:
  bool open(const std::string& fileName) final;
  const std::string& lastError() const final { return lastError_; }
  std::optional<DateRecord> startTime() const final;
  /// NaN: what marks missing values in the file is replaced by it.
  std::optional<float> deleteValue() const final { return std::numeric_limits<float>::quiet_NaN(); }
  std::vector<std::string> doubts() const final { return doubts_; }
  bool getData(int item) final;
  int timeStepCount() const final { return static_cast<int>(times_.size()); }
  std::span<const double> times() const final { return times_; }
  std::span<const float> values(int item) const final;
  std::span<const double> exactValues(int item) final;
  std::vector<double> units(int item) final;

 protected:
  explicit ResultSeries(std::shared_ptr<SeriesReading> reading) : file_(std::move(reading)) {}

  /// Reads what describes the file; false when it is not one of the format, with fail() or a fault of file_.
  virtual bool readHeader() = 0;
  /// The values of an item (from 1) that there is, NaN where one is missing; empty, as readHeader(), on failure.
  virtual std::optional<std::vector<double>> readValues(int item) = 0;
  /// Whether the numbers are of 32 bits.
  virtual bool isSingle() const = 0;

  bool fail(std::string fault);
  bool hasItem(int item) const { return item >= 1 && item <= itemCount(); }
  /// The axis, of secondNumber()s; refuses those that do not increase.
  bool setTimes(std::span<const std::int64_t> seconds);

  BinaryFile file_;
  std::vector<std::string> doubts_;

 private:
  struct Read {
    std::vector<float> values;
    std::vector<double> exact;
  };
  void forget();

  std::string fileName_;
  std::string lastError_;
  std::int64_t startSecond_ = 0;
  std::vector<double> times_;
  std::map<int, Read> read_;
};

}  // namespace mirevo
