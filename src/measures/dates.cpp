#include "measures/dates.h"

#include <cstdint>
#include <string>
#include <utility>

#include "common/calendar.h"
#include "common/fatal_error.h"

namespace mirevo {
namespace {

using namespace date_field;

std::int64_t monthKey(const DateRecord& date) {
  return std::int64_t{date[kYear]} * 100 + date[kMonth];
}

std::int64_t minuteKey(const DateRecord& date) {
  return std::int64_t{date[kDay]} * 10000 + std::int64_t{date[kHour]} * 100 + date[kMinute];
}

bool isLater(const DateRecord& a, const DateRecord& b) {
  if (monthKey(a) != monthKey(b)) return monthKey(a) > monthKey(b);
  return minuteKey(a) > minuteKey(b);
}

}  // namespace

bool date_check(const DateRecord& date, int n) {
  if (n != kDateFieldCount) fatalError("ERROR IN argument list of function date_check !");
  if (isValidDate(date)) return true;
  std::string message = "Error: Invalid date";
  for (int field = kYear; field <= kMinute; ++field) {
    message += ' ';
    message += std::to_string(date[static_cast<std::size_t>(field)]);
  }
  fatalError(message, "expected year >= 0, month 1 to 12, a day of that month, and a time from 00:00 to 24:00");
}

double DBTIMDIF(int& status, const DateRecord& dateA, const DateRecord& dateB, int n) {
  status = -1;
  if (n != kDateFieldCount) fatalError("ERROR IN argument list of function DBTIMDIF!");
  if (!date_check(dateB, n) || !date_check(dateA, n)) return 0.0;
  status = 0;
  const DateRecord* early = &dateB;
  const DateRecord* late = &dateA;
  double sign = 1.0;
  if (!isLater(dateA, dateB)) {  // equal dates too: their difference is -0.0
    sign = -1.0;
    std::swap(early, late);
  }
  const auto days = static_cast<double>(dayNumber((*late)[kYear], (*late)[kMonth], (*late)[kDay]) -
                                        dayNumber((*early)[kYear], (*early)[kMonth], (*early)[kDay]));
  const double hours = (*late)[kHour] - (*early)[kHour];
  const double minutes = (*late)[kMinute] - (*early)[kMinute];
  return sign * (24.0 * days + hours + minutes / 60.0);
}

double daysSince(const DateRecord& origin, const DateRecord& date) {
  int status = 0;
  const double hours = DBTIMDIF(status, date, origin, kDateFieldCount);
  const double seconds = static_cast<double>(date[kSecond]) - static_cast<double>(origin[kSecond]);
  return hours / 24.0 + seconds / kSecondsPerDay;
}

}  // namespace mirevo
