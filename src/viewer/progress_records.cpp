#include "viewer/progress_records.h"

#include <algorithm>
#include <charconv>
#include <cmath>

#include "common/calendar.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::size_t kLongestLine = 4096;  ///< bytes; the rest of a longer one is dropped
constexpr std::size_t kKeptNotices = 200;
constexpr std::size_t kMostCoursePoints = 4096;
constexpr std::size_t kKindLength = 6;

/// Takes `prefix` off `text`; false, and nothing taken, when it does not begin so.
bool takeText(std::string_view& text, std::string_view prefix) {
  if (!text.starts_with(prefix)) return false;
  text.remove_prefix(prefix.size());
  return true;
}

/// Takes a number without sign off `text`.
std::optional<std::int64_t> takeCount(std::string_view& text) {
  std::int64_t count = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), count);
  if (error != std::errc{} || count < 0) return std::nullopt;
  text.remove_prefix(static_cast<std::size_t>(end - text.data()));
  return count;
}

std::optional<double> nonNegative(std::string_view text) {
  const std::optional<double> value = parseReal(text);
  return value && *value >= 0.0 ? value : std::nullopt;
}

/// Takes "2026-11-21 04:10:09 +0100" off `text`: seconds since 1970-01-01 UTC.
std::optional<double> takeTime(std::string_view& text) {
  std::string_view rest = text;
  std::int64_t parts[6] = {};
  constexpr std::string_view kSeparators = "-- ::";
  for (std::size_t i = 0; i < 6; ++i) {
    if (i > 0 && !takeText(rest, kSeparators.substr(i - 1, 1))) return std::nullopt;
    const auto part = takeCount(rest);
    if (!part || *part > 9999) return std::nullopt;
    parts[i] = *part;
  }
  if (parts[1] < 1 || parts[1] > 12) return std::nullopt;
  const bool isEast = takeText(rest, " +");
  if (!isEast && !takeText(rest, " -")) return std::nullopt;
  const auto zone = takeCount(rest);
  if (!zone || *zone > 9999) return std::nullopt;
  text = rest;
  const std::int64_t days =
      dayNumber(parts[0], static_cast<int>(parts[1]), static_cast<int>(parts[2])) - dayNumber(1970, 1, 1);
  const std::int64_t zoneMinutes = *zone / 100 * 60 + *zone % 100;
  const std::int64_t minutes = (days * 24 + parts[3]) * 60 + parts[4] - (isEast ? zoneMinutes : -zoneMinutes);
  return static_cast<double>(minutes * 60 + parts[5]);
}

}  // namespace

void ProgressRecords::clear() {
  *this = ProgressRecords();
}

void ProgressRecords::feed(std::string_view bytes, double time, std::vector<std::string>* messages) {
  if (bytes.empty()) return;
  state_.lastNewsAt = time;
  while (!bytes.empty()) {
    const std::size_t end = bytes.find('\n');
    const std::string_view piece = bytes.substr(0, end);
    if (end != std::string_view::npos && unfinishedLine_.empty()) {
      takeLine(piece.substr(0, kLongestLine), messages);
    } else {
      unfinishedLine_.append(piece.substr(0, kLongestLine - std::min(kLongestLine, unfinishedLine_.size())));
      if (end == std::string_view::npos) return;
      const std::string line = std::move(unfinishedLine_);
      unfinishedLine_.clear();
      takeLine(line, messages);
    }
    bytes.remove_prefix(end + 1);
  }
}

void ProgressRecords::takeLine(std::string_view line, std::vector<std::string>* messages) {
  if (line.size() < kKindLength) return;
  const std::string_view kind = line.substr(0, kKindLength);
  const std::string_view text = line.substr(kKindLength);
  if (kind == "COMSPD") {
    if (const auto value = nonNegative(text)) state_.perSecond = value;
  } else if (kind == "TIMLFT") {
    if (const auto value = nonNegative(text)) state_.secondsLeft = value;
  } else if (kind == "PROGRE") {
    if (const auto value = nonNegative(text)) state_.percent = std::min(100.0, *value);
  } else if (kind == "MESSAG") {
    takeMessage(text);
    if (messages != nullptr) messages->emplace_back(text);
  } else if (kind == "STATUS") {
    takeStatus(text);
  } else if (kind == "STALBL") {
    state_.countLabel = text;
    state_.done = 0;
    state_.failed = 0;
  } else if (kind == "MESLBL") {
    std::string_view count = text;
    if (takeText(count, " of ")) state_.planned = takeCount(count);
  } else {
    return;
  }
  state_.hasRecords = true;
}

void ProgressRecords::takeStatus(std::string_view text) {
  if (text == "Initialisation") {
    const double time = state_.lastNewsAt;
    clear();
    state_.lastNewsAt = time;
  }
  if (takeText(text, "Ended: ")) {
    state_.ending = text;
  } else {
    state_.task = text;
  }
}

void ProgressRecords::takeMessage(std::string_view text) {
  if (takeEvaluationMessage(text)) return;
  std::string_view rest = text;
  if (takeText(rest, "Title: ")) {
    state_.title = rest;
  } else if (takeText(rest, "Run started ")) {
    state_.startedAt = takeTime(rest);
    const std::size_t behindHost = rest.rfind(", process ");
    if (behindHost != std::string_view::npos && takeText(rest, " on ")) {
      state_.host = rest.substr(0, behindHost - 4);
      rest.remove_prefix(behindHost - 4 + std::string_view(", process ").size());
      state_.process = takeCount(rest).value_or(0);
    }
  } else if (!takeBest(text)) {
    addNotice(text);
  }
}

void ProgressRecords::addNotice(std::string_view text) {
  state_.notices.emplace_back(text.substr(0, kLongestLine));
  if (state_.notices.size() > kKeptNotices) state_.notices.pop_front();
  state_.latestMessage = text.substr(0, kLongestLine);
  state_.isLatestMessageNotice = true;
}

bool ProgressRecords::takeEvaluationMessage(std::string_view text) {
  std::string_view rest = text;
  if (!takeText(rest, "Evaluation of parameter set No. ") || !takeCount(rest)) return false;
  if (takeText(rest, " completed: ") || takeText(rest, " taken from the earlier run: ")) {
    ++state_.done;
    if (rest.starts_with("FAILED")) {
      ++state_.failed;
      return false;
    }
  }
  state_.latestMessage = text;
  state_.isLatestMessageNotice = false;
  return true;
}

/// "Best so far: 0.1234 (evaluation 87, 2026-11-21 04:10:09 +0100)", the time optional.
bool ProgressRecords::takeBest(std::string_view text) {
  if (!takeText(text, "Best so far: ")) return false;
  const std::size_t blank = text.find(' ');
  if (blank == std::string_view::npos) return false;
  const auto aggregate = parseReal(text.substr(0, blank));
  text.remove_prefix(blank);
  if (!aggregate || !takeText(text, " (evaluation ")) return false;
  const auto evaluation = takeCount(text);
  if (!evaluation) return false;
  ProgressState::Best best{*aggregate, *evaluation, std::nullopt};
  if (takeText(text, ", ")) best.foundAt = takeTime(text);
  state_.best = best;
  addCoursePoint();
  return true;
}

/// A search that improves in ever smaller steps makes more points than a screen can show: every second is dropped when
/// there are too many, and as many fewer are kept from then on.
void ProgressRecords::addCoursePoint() {
  std::vector<ProgressState::CoursePoint>& course = state_.course;
  if (!course.empty() && skippedCoursePoints_ < coursePointsToSkip_) {
    ++skippedCoursePoints_;
    return;
  }
  skippedCoursePoints_ = 0;
  course.push_back({std::max<std::int64_t>(state_.done, 1), state_.best->aggregate});
  if (course.size() < kMostCoursePoints) return;
  std::size_t kept = 0;
  for (std::size_t i = 0; i < course.size(); i += 2) course[kept++] = course[i];
  course.resize(kept);
  coursePointsToSkip_ = 2 * coursePointsToSkip_ + 1;
}

}  // namespace mirevo
