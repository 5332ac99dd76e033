#include "run/progress/record_summary.h"

#include "common/progress_messages.h"

namespace mirevo {
namespace {

constexpr std::size_t kMostNotices = 200;  ///< as many as a viewer keeps
constexpr std::size_t kMostBests = 512;

void append(std::string& records, std::string_view kind, std::string_view text) {
  records.append(kind).append(text) += '\n';
}

}  // namespace

void RecordSummary::take(std::string_view kind, std::string_view text) {
  if (kind == progress::kMessage) {
    takeMessage(text);
  } else if (kind == progress::kStatus) {
    if (text != progress::kInitialisation) status_ = text;
  } else if (const auto known = latest_.find(kind); known != latest_.end()) {
    known->second = text;
  } else {
    latest_.emplace(kind, text);
  }
}

void RecordSummary::takeMessage(std::string_view text) {
  using progress::EvaluationNews;
  if (const auto news = progress::readEvaluationMessage(text)) {
    if (*news == EvaluationNews::underWay) return;
    ++done_;
    if (*news == EvaluationNews::succeeded) return;
    ++failed_;
  } else if (text.starts_with(progress::kTitle)) {
    title_ = text;
    return;
  } else if (progress::readBest(text)) {
    addBest(text);
    return;
  } else if (started_.empty() && progress::readRunStarted(text)) {
    started_ = text;
    return;
  }
  notices_.emplace_back(text);
  if (notices_.size() > kMostNotices) notices_.pop_front();
}

/// When there are too many, every second one is dropped, and from then on half as many are kept.
void RecordSummary::addBest(std::string_view text) {
  const bool isKept = bests_.empty() || skippedBests_ >= bestsToSkip_;
  if (skippedBests_ > 0) bests_.pop_back();  // it was there as the latest one alone
  skippedBests_ = isKept ? 0 : skippedBests_ + 1;
  bests_.push_back({done_, failed_, std::string(text)});
  if (!isKept || bests_.size() < kMostBests) return;
  std::size_t kept = 0;
  for (std::size_t i = 0; i + 1 < bests_.size(); i += 2) bests_[kept++] = bests_[i];
  bests_[kept++] = bests_.back();
  bests_.resize(kept);
  bestsToSkip_ = 2 * bestsToSkip_ + 1;
}

std::string RecordSummary::records() const {
  std::string text;
  append(text, progress::kStatus, progress::kInitialisation);
  // Near the beginning, by which a viewer tells that the file was begun anew.
  append(text, progress::kMessage, progress::countedMessage(done_, failed_));
  if (!started_.empty()) append(text, progress::kMessage, started_);
  if (!title_.empty()) append(text, progress::kMessage, title_);
  if (!status_.empty()) append(text, progress::kStatus, status_);
  for (const std::string_view kind : {progress::kStatusLabel, progress::kMessageLabel}) {
    if (const auto found = latest_.find(kind); found != latest_.end()) append(text, kind, found->second);
  }
  for (const Best& best : bests_) {
    append(text, progress::kMessage, progress::countedMessage(best.done, best.failed));
    append(text, progress::kMessage, best.text);
  }
  for (const std::string& notice : notices_) {
    // Otherwise its evaluation would be counted.
    const auto news = progress::readEvaluationMessage(notice);
    append(text, progress::kMessage, news ? std::string(progress::kEarlier).append(notice) : notice);
  }
  append(text, progress::kMessage, progress::countedMessage(done_, failed_));
  for (const std::string_view kind : {progress::kSpeed, progress::kTimeLeft, progress::kPercentage}) {
    if (const auto found = latest_.find(kind); found != latest_.end()) append(text, kind, found->second);
  }
  return text;
}

}  // namespace mirevo
