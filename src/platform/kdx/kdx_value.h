#pragma once

#include <string>
#include <string_view>
#include <variant>

#include "platform/kdx/kdx.h"

namespace mirevo {

/// A place in a KDX text that moves on and knows its line and column.
class KdxCursor final {
 public:
  /// Starts behind a byte-order mark.
  explicit KdxCursor(std::string_view text);

  bool atEnd() const { return place_ == text_.size(); }
  bool atLineEndOrComment() const;
  /// The next character; a line end where there is none.
  char peek() const { return atEnd() ? '\n' : text_[place_]; }
  /// What is left of the line, its end excluded.
  std::string_view restOfLine() const;
  KdxPosition position() const;
  /// The next thing, in words for a message: "'=', found ...".
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

/// Reads one value: a text in quotes, an integer, a real or a date. `separator`, '=' or ',', is what stood before it.
std::variant<KdxValue, KdxSyntaxError> readKdxValue(KdxCursor& cursor, char separator);

}  // namespace mirevo
