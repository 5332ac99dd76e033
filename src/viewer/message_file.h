#pragma once

#include <string>
#include <sys/types.h>
#include <vector>

#include "viewer/progress_records.h"

namespace mirevo {

/// Follows a message file as it grows, and notices when another run has started it afresh. The file is opened for every
/// look, so that a replaced file and what other machines wrote to a network file system are seen.
class MessageFile final {
 public:
  explicit MessageFile(std::string path) : path_(std::move(path)) {}

  /// Feeds at most one piece of what is new to `records`. True when there is more to read already.
  bool readPiece(ProgressRecords& records, std::vector<std::string>* messages = nullptr);

 private:
  bool isBegunAnew(int descriptor, off_t size) const;

  std::string path_;
  off_t position_ = 0;
  std::string head_;  ///< the first bytes, which tell one run from the next
  std::vector<char> buffer_;
};

}  // namespace mirevo
