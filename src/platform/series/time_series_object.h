#pragma once

#include <cstddef>
#include <limits>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "common/date_record.h"
#include "platform/series/text_form.h"

namespace mirevo {

/// A time-series file: a strictly increasing time axis and items (series) over it. Items and steps count from 1. Times
/// are days since startTime(). Values are 32-bit; a value equal to deleteValue() (or not a number) is missing.
class TimeSeriesObject {
 public:
  TimeSeriesObject() = default;
  TimeSeriesObject(const TimeSeriesObject&) = delete;
  TimeSeriesObject& operator=(const TimeSeriesObject&) = delete;
  virtual ~TimeSeriesObject() = default;

  /// Reads the file. False when it cannot be opened or is not a valid series file; lastError() then says where and why,
  /// "sim.csv:17:1: expected a time later than 2001-01-31 00:00".
  virtual bool open(const std::string& fileName) = 0;
  virtual const std::string& lastError() const = 0;
  /// Before open(): these items will be read, as far as the file has them, which may save time.
  virtual void willRead(std::span<const int> items) { static_cast<void>(items); }

  /// Date and time of the first step; empty if the file has no steps.
  virtual std::optional<DateRecord> startTime() const = 0;
  virtual std::optional<float> deleteValue() const = 0;
  /// Whether the last line of the file has an end, as lines that were not cut off have; true for a format without
  /// lines.
  virtual bool endsLine() const { return true; }
  virtual int itemCount() const = 0;
  virtual std::string itemName(int item) const = 0;
  /// In which the file says that its values are, "m3/s"; empty where it does not.
  virtual std::string itemUnit(int /*item*/) const { return {}; }
  /// What in the open file seems to be meant in another way than it is read, one warning each.
  virtual std::vector<std::string> doubts() const { return {}; }
  /// The first lines of a text file as they were understood, for a person who is told that it cannot be read; each
  /// begins with a line end. Empty for other formats.
  virtual std::string firstLines() const { return {}; }

  /// Makes the values of the item available; false (with lastError()) when they cannot be read.
  virtual bool getData(int item) = 0;

  virtual int timeStepCount() const = 0;
  /// All step times, in days since the start time; timeStepCount() entries.
  virtual std::span<const double> times() const = 0;
  /// All values of an item, after getData(); timeStepCount() entries.
  virtual std::span<const float> values(int item) const = 0;
  /// The same with all digits of the file, NaN where one is missing. Reads them at the first call.
  virtual std::span<const double> exactValues(int item) = 0;
  /// The unit in which each of these is given in the file: a change by less may not show in it. NaN for a missing
  /// value.
  virtual std::vector<double> units(int item) = 0;
};

struct SeriesReading;

/// An object of the class for the ending of the file name, and for the first bytes of the file where formats share the
/// ending; nullptr for an unknown ending. `reason` then names the known ones. Series of the same run share a `reading`;
/// null: one of its own. With a `form` that is given, a text table of this form, whatever the ending; nullptr, with
/// `reason`, for one of another format.
std::unique_ptr<TimeSeriesObject> createTimeSeriesObject(const std::string& fileName, std::string& reason,
                                                         std::shared_ptr<SeriesReading> reading = nullptr,
                                                         const TextForm& form = {});
/// Whether a series file of this name is text, of which a damaged one may have no end.
bool isTextSeries(const std::string& fileName, const TextForm& form = {});
/// What a user does to mark a value as missing in a series file of this name: "write ...".
std::string howToMarkMissing(const std::string& fileName, float value, const TextForm& form = {});

/// A name with its unit in brackets at the end, "Discharge [m3/s]" or "Discharge (m3/s)", in two parts; the second is
/// empty where there are none.
std::pair<std::string, std::string> splitUnit(std::string_view name);

/// Half a millisecond, in days. Times that are closer are the same time: this is far above the rounding of days in 64
/// bits over thousands of years and far below any time step.
inline constexpr double kSameTimeDays = 0.5e-3 / 86400.0;

/// The largest gap, in days, of a series that is interpolated between any two steps.
inline constexpr double kAnyGap = std::numeric_limits<double>::infinity();

/// Whether a value marks a gap: the delete value, or NaN.
template <typename Value>
bool isMissing(Value value, std::optional<float> deleteValue) {
  return value != value || (deleteValue && value == *deleteValue);
}

/// The value at a time (days since the start of the series): that of a step at this time, else interpolated linearly
/// between its two neighbours, in 64 bits and rounded once to 32; empty outside the time axis, next to a missing value,
/// and between two steps that are farther apart than `largestGap`. getData() must have been called. `hint` is the
/// 0-based step near which the search begins, and is set to where it ends: callers that proceed along the axis pass the
/// same variable again and find each value in constant time.
std::optional<float> valueAt(const TimeSeriesObject& series, int item, double days, std::size_t& hint,
                             double largestGap = kAnyGap);
std::optional<float> valueAt(const TimeSeriesObject& series, int item, double days);
/// The same for a series of `times` and `values`.
std::optional<float> valueAt(std::span<const double> times, std::span<const float> values,
                             std::optional<float> deleteValue, double days, std::size_t& hint, double largestGap);

/// The same in 64 bits for a series of `times` and `values`, in which NaN is missing.
std::optional<double> exactValueAt(std::span<const double> times, std::span<const double> values, double days,
                                   std::size_t& hint, double largestGap = kAnyGap);

/// Largest and smallest value that is not missing with start <= t <= end; empty when there is none.
std::optional<float> extractMaxValue(const TimeSeriesObject& series, int item, double start, double end);
std::optional<float> extractMinValue(const TimeSeriesObject& series, int item, double start, double end);
/// The same in 64 bits for a series of `times` and `values`, in which NaN is missing.
std::optional<double> exactMaxValue(std::span<const double> times, std::span<const double> values, double start,
                                    double end);
std::optional<double> exactMinValue(std::span<const double> times, std::span<const double> values, double start,
                                    double end);

}  // namespace mirevo
