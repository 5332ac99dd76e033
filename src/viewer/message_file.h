#pragma once

#include <string>
#include <sys/types.h>
#include <vector>

#include "viewer/progress_records.h"

namespace mirevo {

/// Follows a message file as it grows, and notices that another run has begun it anew. It is opened for each look, so
/// that what other machines of a network file system wrote is seen, and a file that was replaced.
class MessageFile final {
 public:
  explicit MessageFile(std::string path) : path_(std::move(path)) {}

  /// Feeds at most one piece of what is new to `records`. True when there is more to read at once.
  bool readPiece(ProgressRecords& records, std::vector<std::string>* messages = nullptr);

 private:
  bool isBegunAnew(int descriptor, off_t size) const;

  std::string path_;
  off_t position_ = 0;
  std::string head_;  ///< the first bytes, which tell one run from the next
  std::vector<char> buffer_;
};

}  // namespace mirevo
