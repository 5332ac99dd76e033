#include "platform/series/text_time.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <utility>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/take_text.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::array<std::string_view, 12> kMonths = {"jan", "feb", "mar", "apr", "may", "jun",
                                                      "jul", "aug", "sep", "oct", "nov", "dec"};

void skipBlanks(std::string_view& text) {
  while (!text.empty() && csv::isBlank(text.front())) text.remove_prefix(1);
}

constexpr double secondsOf(TimeUnit unit) {
  switch (unit) {
    case TimeUnit::minutes:
      return 60.0;
    case TimeUnit::hours:
      return 3600.0;
    case TimeUnit::days:
      return 86400.0;
    default:
      return 1.0;
  }
}

}  // namespace

std::optional<TimeFormat> TimeFormat::parse(std::string_view text, std::string& reason) {
  constexpr std::pair<std::string_view, Kind> kCodes[] = {
      {"YYYY", Kind::year}, {"MMM", Kind::monthName}, {"MM", Kind::month},  {"DDD", Kind::dayOfYear},
      {"DD", Kind::day},    {"hh", Kind::hour},       {"mm", Kind::minute}, {"ss", Kind::second}};
  constexpr std::string_view kExpected =
      "expected YYYY, MM (MMM: Jan) and DD, or YYYY and DDD, with hh, mm and ss as far as the file has them, such as "
      "'DD.MM.YYYY hh:mm'";
  TimeFormat format;
  std::string_view rest = trim(text);
  while (!rest.empty()) {
    const char first = rest.front();
    const auto* const code = std::find_if(std::begin(kCodes), std::end(kCodes),
                                          [&](const auto& each) { return rest.starts_with(each.first); });
    Part part;
    if (code != std::end(kCodes)) {
      part.kind = code->second;
      part.digits = part.kind == Kind::monthName ? 0 : code->first.size();
      if (format.has(part.kind)) {
        reason = fmt::format("{}, found {} twice", kExpected, code->first);
        return std::nullopt;
      }
      rest.remove_prefix(code->first.size());
    } else if (std::string_view("YMDhms").find(first) != std::string_view::npos) {
      const std::size_t end = std::min(rest.find_first_not_of(first), rest.size());
      reason = fmt::format("{}, found {}", kExpected, quotedForMessage(rest.substr(0, end)));
      return std::nullopt;
    } else {
      part.character = first == '\t' ? ' ' : first;
      rest.remove_prefix(1);
      if (part.character == ' ' && format.parts_.back().kind == Kind::character &&
          format.parts_.back().character == ' ') {
        continue;
      }
    }
    if (part.digits > 0 && !format.parts_.empty() && format.parts_.back().digits > 0) {
      format.parts_.back().hasAllDigits = true;
      part.hasAllDigits = true;
    }
    format.parts_.push_back(part);
  }
  const bool hasMonth = format.has(Kind::month) || format.has(Kind::monthName);
  const bool isOfDay = !format.has(Kind::day) || hasMonth;
  const bool isOfOneDay = !format.has(Kind::dayOfYear) || !hasMonth;
  const bool isOfOneMonth = !format.has(Kind::month) || !format.has(Kind::monthName);
  const bool hasLarger = (!format.has(Kind::hour) || format.has(Kind::day) || format.has(Kind::dayOfYear)) &&
                         (!format.has(Kind::minute) || format.has(Kind::hour)) &&
                         (!format.has(Kind::second) || format.has(Kind::minute));
  const bool isComplete = format.has(Kind::year) && isOfDay && isOfOneDay && isOfOneMonth && hasLarger;
  if (isComplete) return format;
  reason = fmt::format("{}, found {}", kExpected, quotedForMessage(text));
  return std::nullopt;
}

bool TimeFormat::has(Kind kind) const {
  return std::any_of(parts_.begin(), parts_.end(), [kind](const Part& part) { return part.kind == kind; });
}

std::optional<std::int64_t> TimeFormat::read(std::string_view text) const {
  DateRecord date{0, 1, 1};
  int dayOfYear = 0;
  text = trim(text);
  for (const Part& part : parts_) {
    if (part.kind == Kind::character) {
      if (part.character == ' ') {
        if (text.empty() || !csv::isBlank(text.front())) return std::nullopt;
        skipBlanks(text);
      } else if (!takeText(text, std::string_view(&part.character, 1))) {
        return std::nullopt;
      }
      continue;
    }
    if (!part.hasAllDigits) skipBlanks(text);  // of a number in a field that is wider
    if (part.kind == Kind::monthName) {
      const std::string name = toLowerAscii(text.substr(0, 3));
      const auto* const month = std::find(kMonths.begin(), kMonths.end(), name);
      if (month == kMonths.end()) return std::nullopt;
      date[date_field::kMonth] = static_cast<std::int32_t>(month - kMonths.begin()) + 1;
      text.remove_prefix(name.size());
      continue;
    }
    const bool isFull = part.hasAllDigits || part.kind == Kind::year;
    const auto number = takeNumber(text, isFull ? part.digits : 1, part.digits);
    if (!number) return std::nullopt;
    const auto value = static_cast<std::int32_t>(*number);
    switch (part.kind) {
      case Kind::year:
        date[date_field::kYear] = value;
        break;
      case Kind::month:
        date[date_field::kMonth] = value;
        break;
      case Kind::day:
        date[date_field::kDay] = value;
        break;
      case Kind::hour:
        date[date_field::kHour] = value;
        break;
      case Kind::minute:
        date[date_field::kMinute] = value;
        break;
      case Kind::second:
        date[date_field::kSecond] = value;
        break;
      default:
        dayOfYear = value;
    }
  }
  // "12:30:00.000": the fraction of a second that many loggers write.
  if (!parts_.empty() && parts_.back().kind == Kind::second && (takeText(text, ".") || takeText(text, ","))) {
    const std::string_view fraction = takeDigits(text);
    if (fraction.find_first_not_of('0') != std::string_view::npos) return std::nullopt;
  }
  if (!text.empty() || !isValidDate(date) || date[date_field::kSecond] > 59) return std::nullopt;
  if (!has(Kind::dayOfYear)) return secondNumber(date);
  const int year = date[date_field::kYear];
  if (dayOfYear < 1 || dayNumber(year, 1, dayOfYear) >= dayNumber(year + 1, 1, 1)) return std::nullopt;
  return secondNumber(date) + std::int64_t{dayOfYear - 1} * kSecondsOfDay;
}

TimeReading::TimeReading(const TextForm& form)
    : formatText_(form.timeFormat), unit_(form.timeUnit), hasDecimalComma_(form.decimalSign == ",") {
  std::string reason;
  if (!form.timeFormat.empty()) format_ = TimeFormat::parse(form.timeFormat, reason);
  if (form.timeOrigin) origin_ = secondNumber(*form.timeOrigin);
  stepSeconds_ = form.timeStep * secondsOf(unit_);
}

std::optional<std::int64_t> TimeReading::ofStep(double step) const {
  const double seconds = std::round(step * stepSeconds_);
  constexpr double kMost = 3.2e11;  // ten thousand years
  if (!(std::abs(seconds) < kMost)) return std::nullopt;
  const std::int64_t second = origin_ + static_cast<std::int64_t>(seconds);
  return second >= 0 ? std::optional(second) : std::nullopt;
}

std::optional<std::int64_t> TimeReading::read(std::string_view text) {
  if (unit_ != TimeUnit::none) {
    const auto number = withDecimalPoint(text, hasDecimalComma_ ? ',' : '.');
    const auto step = number ? parseReal(*number) : std::nullopt;
    return step ? ofStep(*step) : std::nullopt;
  }
  if (format_) return format_->read(text);
  const char* at = text.data();
  const char* const end = at + text.size();
  const auto second = dates_.scanCell(at, end);
  return at == end ? second : std::nullopt;
}

std::string TimeReading::expected() const {
  if (unit_ != TimeUnit::none) {
    return fmt::format("a number of {} since the Time_Origin", stepSeconds_ == secondsOf(unit_)
                                                                   ? kTimeUnitWords[static_cast<std::size_t>(unit_)]
                                                                   : std::string_view("steps"));
  }
  if (format_) return fmt::format("a valid time in the form {}", formatText_);
  return "a valid time like 2001-01-31 12:30";
}

std::optional<std::string> withDecimalPoint(std::string_view text, char decimalSign) {
  std::string number(text);
  if (decimalSign == '.') return number;
  if (number.find('.') != std::string::npos) return std::nullopt;
  std::replace(number.begin(), number.end(), decimalSign, '.');
  return number;
}

}  // namespace mirevo
