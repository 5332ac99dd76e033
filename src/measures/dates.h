#pragma once

#include <cmath>
#include <cstdint>

#include "common/date_record.h"

namespace mirevo {

/// True if the date is valid (isValidDate()). Otherwise throws FatalError "Error: Invalid date ..."; throws "ERROR IN
/// argument list of function date_check !" when n is not 9.
bool date_check(const DateRecord& date, int n);

/// dateA minus dateB in hours; seconds are ignored. `status` is 0 when both are valid, else -1 with the result 0. dateB
/// is validated first, then dateA; n must be 9.
double DBTIMDIF(int& status, const DateRecord& dateA, const DateRecord& dateB, int n);

/// Days from `origin` to `date`, including the seconds of both.
double daysSince(const DateRecord& origin, const DateRecord& date);

inline constexpr double kSecondsPerDay = 86400.0;

/// The nearest second so many days after `origin`; both are a secondNumber().
inline std::int64_t secondAfter(std::int64_t origin, double days) {
  return origin + std::llround(days * kSecondsPerDay);
}

}  // namespace mirevo
