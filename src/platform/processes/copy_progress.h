#pragma once

#include <atomic>
#include <cstdint>
#include <functional>
#include <utility>

namespace mirevo {

/// How much of a copy is done; may lie in memory that several processes share.
struct CopiedAmount {
  std::atomic<std::uint64_t> bytes{0};  ///< copied so far, also of files that are not complete
  std::atomic<std::uint64_t> files{0};
  std::atomic<std::uint64_t> keptFiles{0};  ///< those of them that had not to be copied
};
static_assert(std::atomic<std::uint64_t>::is_always_lock_free);

/// What the copying of a folder is watched by.
class CopyProgress final {
 public:
  CopyProgress() = default;
  /// `watch` is called often, after each file or a part of a second, and may throw to end the copying.
  CopyProgress(CopiedAmount* amount, std::function<void()> watch) : amount_(amount), watch_(std::move(watch)) {}

  void look() const {
    if (watch_) watch_();
  }
  void add(std::uint64_t bytes) const {
    if (amount_ != nullptr) amount_->bytes += bytes;
    look();
  }
  /// A file of so many bytes is done.
  void addFile(std::uint64_t bytes, bool wasThere) const {
    if (amount_ != nullptr) {
      ++amount_->files;
      if (wasThere) {
        ++amount_->keptFiles;
        amount_->bytes += bytes;
      }
    }
    look();
  }

 private:
  CopiedAmount* amount_ = nullptr;
  std::function<void()> watch_;
};

}  // namespace mirevo
