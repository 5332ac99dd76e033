#include "viewer/progress_records.h"

#include <algorithm>

#include "common/progress_messages.h"
#include "common/take_text.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::size_t kLongestLine = 4096;  ///< bytes; the rest of a longer one is dropped
constexpr std::size_t kKeptNotices = 200;
constexpr std::size_t kMostCoursePoints = 4096;
constexpr std::size_t kKindLength = 6;

std::optional<double> nonNegative(std::string_view text) {
  const std::optional<double> value = parseReal(text);
  return value && *value >= 0.0 ? value : std::nullopt;
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
  if (kind == progress::kSpeed) {
    if (const auto value = nonNegative(text)) state_.perSecond = value;
  } else if (kind == progress::kTimeLeft) {
    if (const auto value = nonNegative(text)) state_.secondsLeft = value;
  } else if (kind == progress::kPercentage) {
    if (const auto value = nonNegative(text)) state_.percent = std::min(100.0, *value);
  } else if (kind == progress::kMessage) {
    takeMessage(text);
    if (messages != nullptr) messages->emplace_back(text);
  } else if (kind == progress::kStatus) {
    takeStatus(text);
  } else if (kind == progress::kStatusLabel) {
    state_.countLabel = text;
    state_.done = 0;
    state_.failed = 0;
  } else if (kind == progress::kMessageLabel) {
    std::string_view count = text;
    if (takeText(count, progress::kOfPlanned)) state_.planned = takeNumber(count);
  } else {
    return;
  }
  state_.hasRecords = true;
}

void ProgressRecords::takeStatus(std::string_view text) {
  if (text == progress::kInitialisation) {
    const double time = state_.lastNewsAt;
    clear();
    state_.lastNewsAt = time;
  }
  if (takeText(text, progress::kEnded)) {
    state_.ending = text;
  } else {
    state_.task = text;
  }
}

void ProgressRecords::takeMessage(std::string_view text) {
  if (takeEvaluationMessage(text)) return;
  std::string_view title = text;
  if (takeText(title, progress::kTitle)) {
    state_.title = title;
  } else if (auto origin = progress::readRunStarted(text)) {
    state_.origin = *std::move(origin);
  } else if (const auto counted = progress::readCounted(text)) {
    state_.done = counted->done;
    state_.failed = counted->failed;
  } else if (const auto best = progress::readBest(text)) {
    state_.best = best;
    addCoursePoint();
  } else {
    addNotice(text);
  }
}

void ProgressRecords::addNotice(std::string_view text) {
  state_.notices.emplace_back(text.substr(0, kLongestLine));
  if (state_.notices.size() > kKeptNotices) state_.notices.pop_front();
  state_.latestMessage = text.substr(0, kLongestLine);
  state_.isLatestMessageNotice = true;
}

/// False for a message that is not routine: one that is not about an evaluation, or about a failed one.
bool ProgressRecords::takeEvaluationMessage(std::string_view text) {
  using progress::EvaluationNews;
  const auto news = progress::readEvaluationMessage(text);
  if (!news) return false;
  if (*news != EvaluationNews::underWay) ++state_.done;
  if (*news == EvaluationNews::failed) {
    ++state_.failed;
    return false;
  }
  state_.latestMessage = text;
  state_.isLatestMessageNotice = false;
  return true;
}

/// A search that improves in ever smaller steps makes more points than a screen can show. When there are too many,
/// every second one is dropped, and from then on half as many are kept.
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
