#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace mirevo {

/// What the times of MODFLOW's binary files, numbers of time units since the start of the simulation, are as dates. The
/// files say neither unit nor start: these are TIME_UNITS and START_DATE_TIME of the one `.tdis` file in the folder of
/// the file, or in the folder above (US Geological Survey, "MODFLOW 6, Description of Input and Output", TDIS package).
/// Without one they are days, and the start is 2000-01-01 00:00.
class ModflowClock final {
 public:
  /// Reads the `.tdis` file that belongs to a file. False, with the reason, when there are several, or it cannot be
  /// read.
  bool read(const std::string& fileName, std::string& reason);
  /// The content of one, for read(); `name` is used in messages.
  bool parse(const std::string& name, const std::string& content, std::string& reason);

  /// secondNumber() of a time, rounded to whole seconds; empty for a negative time and one of 8000 years or more.
  std::optional<std::int64_t> secondOf(double time) const;

 private:
  std::int64_t start_ = 0;
  double unitSeconds_ = 0.0;
};

/// What a time is expected to be where there is none.
inline constexpr std::string_view kModflowTime =
    "a time from 0 to 8000 years (in days, or in the unit that a .tdis file beside it gives)";

}  // namespace mirevo
