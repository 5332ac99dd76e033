#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "measures/instruction_file.h"
#include "measures/listing_settings.h"
#include "platform/series/gathered_series.h"
#include "platform/series/series_reading.h"

namespace mirevo {

/// What is wrong with such settings.
struct ListingFault {
  std::string_view keyword;
  std::string text;
};

/// Which series a listing has: the numbers that belong to each of them, and their times.
///
/// A series has the name that its numbers have in common: what is left of "flow_19900101" or "h1_17" without the date
/// or number at the end and one of `_`, `-`, `.` and `:` before it. A table may name the series of each number instead.
class ListingForm final {
 public:
  struct Series {
    std::string name;
    std::size_t axis = 0;                  ///< index of its times in axes()
    std::vector<std::size_t> places = {};  ///< of its numbers among InstructionFile::names()
  };

  /// Reads the files that the settings name. Null, with `fault`, where they give no series.
  static std::shared_ptr<const ListingForm> read(const ListingSettings& settings, ListingFault& fault);
  /// The same with the contents of these files.
  static std::shared_ptr<const ListingForm> make(const ListingSettings& settings, std::string_view instructions,
                                                 std::string_view times, ListingFault& fault);

  const InstructionFile& instructions() const { return instructions_; }
  /// In the order in which the first number of each is read.
  const std::vector<Series>& series() const { return series_; }
  /// secondNumber()s, strictly increasing.
  const std::vector<std::vector<std::int64_t>>& axes() const { return axes_; }
  /// Of names that belong to no series.
  const std::vector<std::string>& doubts() const { return doubts_; }

 private:
  friend class ListingFormMaker;
  explicit ListingForm(InstructionFile instructions) : instructions_(std::move(instructions)) {}

  InstructionFile instructions_;
  std::vector<Series> series_;
  std::vector<std::vector<std::int64_t>> axes_;
  std::vector<std::string> doubts_;
};

/// The series of a listing. One without a line has no time step yet.
class ListingSeries final : public GatheredSeries {
 public:
  explicit ListingSeries(std::shared_ptr<const ListingForm> form, std::shared_ptr<SeriesReading> reading = nullptr)
      : GatheredSeries(reading), form_(std::move(form)), reading_(std::move(reading)) {}

 private:
  bool read(FileParts& parts) override;

  std::shared_ptr<const ListingForm> form_;
  std::shared_ptr<SeriesReading> reading_;
};

}  // namespace mirevo
