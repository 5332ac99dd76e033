#pragma once

#include "common/date_record.h"

namespace mirevo {

/// Whether the date is valid: hour 24 only with minute 0; a minute of 60 is accepted on purpose. Ends the run with
/// "Error: Invalid date ..." otherwise, and with "ERROR IN argument list of function date_check !" when n is not 9.
bool date_check(const DateRecord& date, int n);

/// dateA minus dateB in hours; seconds do not enter. `status` is 0 when both are valid, else -1 with the result 0.
/// dateB is validated first, then dateA; n must be 9.
double DBTIMDIF(int& status, const DateRecord& dateA, const DateRecord& dateB, int n);

/// Days from `origin` to `date`, with the seconds of both.
double daysSince(const DateRecord& origin, const DateRecord& date);

}  // namespace mirevo
