#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "common/descriptor.h"

namespace mirevo {

struct SeriesReading;

/// The content of a file, or of a text in memory, a part at a time.
class FileParts final {
 public:
  explicit FileParts(std::string_view text) : text_(text) {}
  /// `path` is opened; see fault().
  FileParts(const std::string& path, std::shared_ptr<SeriesReading> reading);

  /// The next part, which holds until the following call; empty at the end and after a fault.
  std::string_view next();
  /// The next line, without its end (LF or CRLF) and a byte-order mark before the first, which holds until the
  /// following call; empty optional at the end and after a fault. Not to be mixed with next().
  std::optional<std::string_view> nextLine();
  /// Whether the last line that nextLine() returned had an end.
  bool endsLine() const { return endsLine_; }
  /// Why the file cannot be read (on); else empty.
  const std::string& fault() const { return fault_; }

 private:
  std::string_view text_;  ///< what is left of a text in memory
  std::shared_ptr<SeriesReading> reading_;
  std::unique_ptr<Descriptor> file_;  ///< null: a text in memory
  std::string part_;
  std::string_view rest_;  ///< of the part, for lines
  std::string line_;       ///< of several parts
  bool isBehindFirstLine_ = false;
  bool endsLine_ = true;
  std::string fault_;
};

}  // namespace mirevo
