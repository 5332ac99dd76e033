#include "evaluation/ranks/master_watch.h"

#include <utility>

namespace mirevo {

MasterWatch::MasterWatch(std::string killFile, Clock clock, std::function<void()> endJob)
    : killFile_(std::move(killFile)),
      clock_(std::move(clock)),
      endJob_(std::move(endJob)),
      leftOver_(look()),
      nextLook_(clock_()) {}

std::optional<struct stat> MasterWatch::look() const {
  struct stat status {};
  if (::stat(killFile_.c_str(), &status) != 0) return std::nullopt;
  return status;
}

void MasterWatch::requireAnswerWithin(double seconds) {
  const double now = clock_();
  if (now < nextLook_) return;
  nextLook_ = now + kLookSeconds;
  const auto file = look();
  if (!file) {
    firstSeen_.reset();
    leftOver_.reset();
    return;
  }
  const bool isLeftOver = leftOver_ && leftOver_->st_ino == file->st_ino &&
                          leftOver_->st_ctim.tv_sec == file->st_ctim.tv_sec &&
                          leftOver_->st_ctim.tv_nsec == file->st_ctim.tv_nsec;
  if (isLeftOver) return;
  if (!firstSeen_) firstSeen_ = now;
  if (now - *firstSeen_ >= seconds) endJob_();
}

}  // namespace mirevo
