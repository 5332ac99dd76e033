#pragma once

#include <string>
#include <string_view>
#include <variant>

#include "platform/kdx/kdx.h"

namespace mirevo {

/// A reading position in a KDX text, with its line and column.
class KdxCursor final {
 public:
  /// Starts after a byte-order mark, if there is one.
  explicit KdxCursor(std::string_view text);

  bool atEnd() const { return place_ == text_.size(); }
  bool atLineEndOrComment() const;
  /// The next character; a line end at the end of the text.
  char peek() const { return atEnd() ? '\n' : text_[place_]; }
  /// The rest of the line, without its end.
  std::string_view restOfLine() const;
  KdxPosition position() const;
  /// What comes next, in words for a message.
  std::string describeNext() const;

  void advance(std::size_t count = 1) { place_ += count; }
  void skipBlanks();
  void skipBlanksCommentsAndLineEnds();
  std::string_view takeWhile(bool (*belongs)(char));

 private:
  std::string_view text_;
  std::size_t place_ = 0;
  std::size_t lineStart_ = 0;
  int line_ = 1;
};

/// Reads one value: a text in quotes, an integer, a real or a date. `separator`, '=' or ',', is the character before
/// it.
std::variant<KdxValue, KdxSyntaxError> readKdxValue(KdxCursor& cursor, char separator);

}  // namespace mirevo
