#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "common/date_record.h"

namespace mirevo {

/// How the numbers that an instruction file reads from a listing become series, as a setup says it: in one of three
/// ways.
struct ListingSettings {
  std::string instructionFile;      ///< absolute; empty: the series is not in a listing
  std::string timesFile;            ///< absolute; a table of names and times
  std::string dates;                ///< what names end in, "YYYYMMDD"
  std::optional<DateRecord> start;  ///< time of the first number of each series
  std::optional<double> stepHours;  ///< from one number to the next

  bool operator==(const ListingSettings&) const = default;
};
inline constexpr std::string_view kInstructionFileKeyword = "Instruction_File";
inline constexpr std::string_view kInstructionTimesKeyword = "Instruction_Times";
inline constexpr std::string_view kInstructionDatesKeyword = "Instruction_Dates";
inline constexpr std::string_view kInstructionStartKeyword = "Instruction_Start";
inline constexpr std::string_view kInstructionStepKeyword = "Instruction_Step";

}  // namespace mirevo
