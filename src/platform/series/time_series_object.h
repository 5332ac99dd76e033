#pragma once

#include <cstddef>
#include <memory>
#include <optional>
#include <span>
#include <string>

#include "common/date_record.h"

namespace mirevo {

/// A time-series file: a strictly increasing time axis and items (series) over it. Items and steps count from 1. Times
/// are days since startTime(). Values are 32-bit; a value equal to deleteValue() (or not a number) is missing.
class TimeSeriesObject {
 public:
  TimeSeriesObject() = default;
  TimeSeriesObject(const TimeSeriesObject&) = delete;
  TimeSeriesObject& operator=(const TimeSeriesObject&) = delete;
  virtual ~TimeSeriesObject() = default;

  /// Reads the file. False when it cannot be opened or is no valid series file; lastError() then says where and why,
  /// "sim.csv:17:1: expected a time later than 2001-01-31 00:00".
  virtual bool open(const std::string& fileName) = 0;
  virtual const std::string& lastError() const = 0;

  /// Date and time of the first step; nothing when the file has no step.
  virtual std::optional<DateRecord> startTime() const = 0;
  virtual std::optional<float> deleteValue() const = 0;
  virtual int itemCount() const = 0;
  virtual std::string itemName(int item) const = 0;

  /// Makes the item's values available; false (with lastError()) when the item's values cannot be read.
  virtual bool getData(int item) = 0;

  virtual int timeStepCount() const = 0;
  /// All step times at once, in days since the start time: shape timeStepCount().
  virtual std::span<const double> times() const = 0;
  /// All values of an item after getData(): shape timeStepCount().
  virtual std::span<const float> values(int item) const = 0;
};

/// An object of the kind that the file name's ending asks for; nullptr when no kind reads such files. `reason` then
/// names the known endings.
std::unique_ptr<TimeSeriesObject> createTimeSeriesObject(const std::string& fileName, std::string& reason);

/// Two times of one axis closer than half a millisecond (in days) are the same time: far above the rounding of days in
/// 64 bits over thousands of years, far below any time step.
inline constexpr double kSameTimeDays = 0.5e-3 / 86400.0;

/// Whether a value marks a gap: the delete value, or no number.
inline bool isMissing(float value, std::optional<float> deleteValue) {
  return value != value || (deleteValue && value == *deleteValue);
}

/// Value at a time (days since the object's start): that of the step there, else linear between its two neighbours,
/// computed in 64 bits and rounded once to 32; nothing outside the axis or beside a missing neighbour. The item's data
/// must be available. `hint` is a step (0-based) near which the search begins and where it ended: callers that walk
/// along an axis pass the same variable again and find each value in constant time.
std::optional<float> valueAt(const TimeSeriesObject& series, int item, double days, std::size_t& hint);
std::optional<float> valueAt(const TimeSeriesObject& series, int item, double days);

/// Largest and smallest value that is not missing with start <= t <= end; nothing when there is none.
std::optional<float> extractMaxValue(const TimeSeriesObject& series, int item, double start, double end);
std::optional<float> extractMinValue(const TimeSeriesObject& series, int item, double start, double end);

}  // namespace mirevo
